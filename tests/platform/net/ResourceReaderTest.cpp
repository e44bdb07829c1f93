#include "platform/net/ResourceReader.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <string>
#include <utility>
#include <vector>

#include "tests/support/GzipSamples.h"
#include "tests/support/HTTPTestServer.h"
#include "tests/support/TemporaryDirectory.h"

namespace platform {
namespace {

using Connection = HTTPTestServer::Connection;

constexpr std::string_view kGzipHeader = "Content-Encoding: gzip\r\n";
constexpr const char* kForeignCoding =
    "transfer 61: The body comes in a content coding that was not asked for";
constexpr const char* kCutShort = "transfer 61: The compressed body is cut short";

std::string repeated(std::string_view text, int count) {
  std::string result;
  for (int i = 0; i < count; ++i) result += text;
  return result;
}

class ResourceReaderTest : public ::testing::Test {
 protected:
  /// The resource, or the domain, code and description of the failure in one text.
  static std::string read(const std::string& url, std::uint64_t limit = kWholeReadLimit) {
    ErrorSlot error;
    std::optional<ByteSource> source = readResource(URL::parse(url).value(), error, limit, 0);
    const std::optional<std::string> resource = source ? source->readAll(error) : std::nullopt;
    EXPECT_NE(resource.has_value(), error.has_value());
    if (resource) return *resource;
    return error->domain + " " + std::to_string(error->code) + ": " + error->description;
  }

  /// What reading the answer gives.
  std::string readAnswer(const std::string& answer, std::uint64_t limit = kWholeReadLimit) {
    server_.serve("/answer", answer);
    return read(server_.url("/answer"), limit);
  }
  /// The same when the server closes the connection behind it.
  std::string readAnswerAndClose(const std::string& answer, std::uint64_t limit = kWholeReadLimit) {
    server_.serve("/answer", [answer](Connection& connection) {
      connection.send(answer);
      connection.close();
    });
    return read(server_.url("/answer"), limit);
  }

  std::string readCoded(const std::string& coding) {
    return readAnswer(HTTPTestServer::response("<rss/>", "Content-Encoding: " + coding + "\r\n"));
  }

  HTTPTestServer server_;
};

TEST_F(ResourceReaderTest, ReadsAnswers) {
  EXPECT_EQ(readAnswer(HTTPTestServer::response("<rss/>")), "<rss/>");
  EXPECT_EQ(readAnswer(HTTPTestServer::response("")), "");
  EXPECT_EQ(readAnswer(HTTPTestServer::response("", "", "404 No")), "HTTP 404: HTTP status 404");
}

TEST_F(ResourceReaderTest, AsksForCompressionAndUndoesIt) {
  EXPECT_EQ(readAnswer(HTTPTestServer::response(kGzipStream, kGzipHeader)), kGzipText);
  EXPECT_NE(server_.requests().at(0).find("\r\nAccept-Encoding: gzip\r\n"), std::string::npos);
  EXPECT_EQ(readAnswer(HTTPTestServer::response(kGzipStream, "content-encoding: X-GZip\r\n")),
            kGzipText);
  EXPECT_EQ(readAnswerAndClose("HTTP/1.1 200 OK\r\nContent-Encoding: gzip\r\n\r\n" +
                               std::string(kGzipStream)),
            kGzipText);
}

TEST_F(ResourceReaderTest, LeavesABodyThatIsOnlyGzipInItself) {
  EXPECT_EQ(readAnswer(HTTPTestServer::response(kGzipStream)), kGzipStream);
}

TEST_F(ResourceReaderTest, CompressedBodyCutShortIsAFailure) {
  for (const std::size_t length : {0U, 5U, 20U, 37U}) {
    const std::string_view cut = kGzipStream.substr(0, length);
    EXPECT_EQ(readAnswer(HTTPTestServer::response(cut, kGzipHeader)), kCutShort) << length;
  }
  EXPECT_EQ(readAnswerAndClose("HTTP/1.1 200 OK\r\nContent-Encoding: gzip\r\n\r\n" +
                               std::string(kGzipStream.substr(0, 20))),
            kCutShort);
  std::string answer = HTTPTestServer::response(kGzipStream, kGzipHeader);
  answer.pop_back();
  EXPECT_EQ(readAnswerAndClose(answer),
            "transfer 18: transfer closed with 1 bytes remaining to read");
}

TEST_F(ResourceReaderTest, MalformedCompressedBodyIsAFailure) {
  EXPECT_EQ(readCoded("gzip"), "transfer 61: The compressed body is malformed");
}

TEST_F(ResourceReaderTest, CompressionBombsEnd) {
  const auto bomb = [](int size) {  // in units of 64 KiB
    return HTTPTestServer::response(repeated(kGzipZeros, size), kGzipHeader);
  };
  EXPECT_EQ(readAnswer(bomb(10'000), 1'000'000),
            "transfer 63: The resource is larger than 1000000 bytes");
  // Almost 700 times its size.
  EXPECT_EQ(readAnswer(bomb(17)),
            "transfer 63: The body is more than 50 times as large as its compressed form");
  // A smaller document may have any ratio.
  EXPECT_EQ(readAnswer(bomb(16)).size(), 16U * 65'536U);
}

TEST_F(ResourceReaderTest, ContentCodingsThatWereNotAskedForAreFailures) {
  for (const char* coding :
       {"br", "deflate", "zstd", "compress", "X-Compress", "gzip, gzip", "gzip , br"}) {
    EXPECT_EQ(readCoded(coding), kForeignCoding) << coding;
  }
}

TEST_F(ResourceReaderTest, NamesThatAreNoContentCodingsDoNoHarm) {
  for (const char* coding : {"", "identity", "none", "utf-8", "binary, identity"}) {
    EXPECT_EQ(readCoded(coding), "<rss/>") << coding;
  }
}

TEST_F(ResourceReaderTest, TheCharsetIsTheEncodingHint) {
  const std::vector<std::pair<std::string, std::string>> rows = {
      {"text/xml", ""},
      {"text/xml; charset=koi8-r", "koi8-r"},
      {"text/xml;CharSet = \"KOI8-R\" ;charset=utf-8", "KOI8-R"},
      {"text/xml; a=\"b;charset=c\\\"; charset=d\"; charset=\"e\\-f\"", "e-f"},
      {"text/xml; charset", ""},
      {"text/xml; charset=", ""},
      {"charset=koi8-r; x", "koi8-r"},
      {"text/xml; charset=koi8\\-r", "koi8\\-r"},
      {"text/xml; charset=\"koi8-r\\", "koi8-r\\"},
      {"\"", ""},
  };
  for (const auto& [type, hint] : rows) {
    server_.serve("/", HTTPTestServer::response("<rss/>", "Content-Type: " + type + "\r\n"));
    ErrorSlot error;
    const auto source =
        readResource(URL::parse(server_.url("/")).value(), error, kWholeReadLimit, 0);
    ASSERT_TRUE(source);
    EXPECT_EQ(source->encodingHint(), hint) << type;
  }
}

TEST_F(ResourceReaderTest, LimitIsTheLastLengthThatIsTaken) {
  const std::string tooLarge = "transfer 63: The resource is larger than 4 bytes";
  const std::string announced = HTTPTestServer::response("12345");
  const std::string unknown = "HTTP/1.1 200 OK\r\n\r\n12345";
  EXPECT_EQ(readAnswer(announced, 5), "12345");
  EXPECT_EQ(readAnswer(announced, 4), tooLarge);
  EXPECT_EQ(readAnswerAndClose(unknown, 5), "12345");
  EXPECT_EQ(readAnswerAndClose(unknown, 4), tooLarge);
}

TEST_F(ResourceReaderTest, AnnouncedLengthBeyondTheLimitFailsAtOnce) {
  EXPECT_EQ(readAnswer("HTTP/1.1 200 OK\r\nContent-Length: 9000000000\r\n\r\n"),
            "transfer 63: The resource is larger than 2147483648 bytes");
}

TEST_F(ResourceReaderTest, ReadsFilesAndNothingElse) {
  const TemporaryDirectory directory;
  const std::string url = fileURLText(directory.addFile("a \u00E9.xml", "<rss/>"));
  EXPECT_EQ(read(url), "<rss/>");
  EXPECT_EQ(read("FILE://localhost" + url.substr(7) + "?query#fragment"), "<rss/>");

  const std::string fifo = directory / "fifo";
  ASSERT_EQ(::mkfifo(fifo.c_str(), 0600), 0);
  EXPECT_EQ(read(fileURLText(fifo)), "POSIX 22: Not a regular file");
  EXPECT_EQ(read(fileURLText(directory / "none")), "POSIX 2: No such file or directory");
  EXPECT_EQ(read("file:///"), "POSIX 21: Is a directory");
  EXPECT_EQ(read("file:///etc/passwd%00.xml"), "POSIX 22: Invalid argument");
}

}  // namespace
}  // namespace platform
