#include "platform/net/Download.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/syscall.h>

#include <chrono>
#include <csignal>
#include <filesystem>
#include <functional>
#include <memory>
#include <thread>
#include <vector>

#include "platform/net/EventLoop.h"
#include "platform/net/ResourceReader.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/GzipSamples.h"
#include "tests/support/HTTPTestServer.h"
#include "tests/support/RefusedSystemCall.h"
#include "tests/support/TemporaryDirectory.h"

namespace platform {
namespace {

using Connection = HTTPTestServer::Connection;
using ::testing::ElementsAre;
using ::testing::UnorderedElementsAre;

URL urlOf(const std::string& text) {
  return URL::parse(text).value();
}

/// Writes the events down, data events that follow one another as one.
class Recorder : public DownloadReceiver {
 public:
  std::vector<std::string> events;
  std::uint64_t total = 0;
  int dataEvents = 0;
  bool ended = false;
  std::function<void()> atEvent = [] {};

  void didReceiveResponse(Download&, std::int64_t expectedLength) override {
    note("response " + std::to_string(expectedLength));
  }
  void didReceiveDataOfLength(Download&, std::uint64_t length) override {
    EXPECT_GT(length, 0U);
    if (!events.empty() && events.back() == dataEvent()) events.pop_back();
    total += length;
    ++dataEvents;
    note(dataEvent());
  }
  void downloadDidFinish(Download&) override {
    ended = true;
    note("finished");
  }
  void didFailWithError(Download&, const ErrorRecord& error) override {
    ended = true;
    note("failed: " + error.domain + " " + std::to_string(error.code) + ": " + error.description);
  }

 private:
  std::string dataEvent() const { return "data " + std::to_string(total); }
  void note(std::string event) {
    events.push_back(std::move(event));
    const std::function<void()> action = atEvent;  // may end this recorder's download
    action();
  }
};

class DownloadTest : public ::testing::Test {
 protected:
  /// The events of a download that runs to its end.
  std::vector<std::string> download(const std::string& url) { return download(url, destination_); }
  static std::vector<std::string> download(const std::string& url, const std::string& destination) {
    Recorder recorder;
    const Download download(urlOf(url), destination, recorder);
    EXPECT_TRUE(recorder.events.empty()) << "an event came before the event loop ran";
    while (!recorder.ended && runEventLoopOnce()) continue;
    EXPECT_FALSE(runEventLoopOnce()) << "an ended download keeps the event loop busy";
    return recorder.events;
  }
  std::vector<std::string> downloadAnswer(const std::string& answer, bool closes = false) {
    server_.serve("/answer", [answer, closes](Connection& connection) {
      connection.send(answer);
      if (closes) connection.close();
    });
    return download(server_.url("/answer"));
  }

  HTTPTestServer server_;
  TemporaryDirectory directory_;
  std::string destination_ = directory_ / "media.mp3";
};

TEST_F(DownloadTest, WritesOrReplacesTheFile) {
  EXPECT_THAT(downloadAnswer(HTTPTestServer::response("media")),
              ElementsAre("response 5", "data 5", "finished"));
  EXPECT_EQ(contentOf(destination_), "media");
  EXPECT_THAT(downloadAnswer(HTTPTestServer::response("")), ElementsAre("response 0", "finished"));
  EXPECT_EQ(contentOf(destination_), "");
  server_.serve("/elsewhere", HTTPTestServer::response("elsewhere"));
  EXPECT_THAT(downloadAnswer(HTTPTestServer::redirect("/elsewhere")),
              ElementsAre("response 9", "data 9", "finished"));
  EXPECT_EQ(contentOf(destination_), "elsewhere");
  EXPECT_THAT(directory_.names(), ElementsAre("media.mp3"));
}

TEST_F(DownloadTest, UnknownLengthIsAnnouncedAsMinusOne) {
  EXPECT_THAT(downloadAnswer("HTTP/1.1 200 OK\r\n\r\nmedia", true),
              ElementsAre("response -1", "data 5", "finished"));
  EXPECT_THAT(downloadAnswer("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n"
                             "5\r\nmedia\r\n0\r\n\r\n"),
              ElementsAre("response -1", "data 5", "finished"));
  EXPECT_EQ(contentOf(destination_), "media");
}

TEST_F(DownloadTest, AsksForNoCodingAndUndoesGzip) {
  const std::string size = std::to_string(kGzipText.size());
  EXPECT_THAT(downloadAnswer(HTTPTestServer::response(kGzipStream, "Content-Encoding: gzip\r\n")),
              ElementsAre("response -1", "data " + size, "finished"));
  EXPECT_EQ(contentOf(destination_), kGzipText);
  EXPECT_NE(server_.requests().at(0).find("\r\nAccept-Encoding: identity\r\n"), std::string::npos);
  EXPECT_THAT(downloadAnswer(HTTPTestServer::response("media", "Content-Encoding: Identity\r\n")),
              ElementsAre("response 5", "data 5", "finished"));
}

TEST_F(DownloadTest, OtherCodingsAreFailures) {
  const std::string foreign =
      "failed: transfer 61: The body comes in a content coding that was not asked for";
  for (const std::string coding : {"br", "gzip, br", "gzip\r\nContent-Encoding: gzip", "utf-8"}) {
    EXPECT_THAT(
        downloadAnswer(HTTPTestServer::response("media", "Content-Encoding: " + coding + "\r\n")),
        ElementsAre(foreign));
  }
  const std::string gzip = "Content-Encoding: gzip\r\n";
  EXPECT_EQ(downloadAnswer(HTTPTestServer::response(kGzipStream.substr(0, 30), gzip)).back(),
            "failed: transfer 61: The compressed body is cut short");
  EXPECT_EQ(downloadAnswer(HTTPTestServer::response("media", gzip)).back(),
            "failed: transfer 61: The compressed body is malformed");
  EXPECT_THAT(directory_.names(), ElementsAre());
}

TEST_F(DownloadTest, DataEventsComeAsTheDataComes) {
  server_.serve("/drip", [](Connection& connection) {
    connection.send("HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\n");
    for (const char c : std::string("media")) {
      std::this_thread::sleep_for(std::chrono::milliseconds(20));
      connection.send({&c, 1});
    }
  });
  Recorder recorder;
  const Download download(urlOf(server_.url("/drip")), destination_, recorder);
  while (!recorder.ended && runEventLoopOnce()) {
    EXPECT_TRUE(recorder.ended || !std::filesystem::exists(destination_));
  }
  EXPECT_THAT(recorder.events, ElementsAre("response 5", "data 5", "finished"));
  EXPECT_GT(recorder.dataEvents, 1);
}

TEST_F(DownloadTest, ResourcesAndDownloadsShareOneConnection) {
  server_.serve("/feed", HTTPTestServer::response("feed"));
  ErrorSlot error;
  EXPECT_EQ(readResource(urlOf(server_.url("/feed")), error, kWholeReadLimit, 0)->readAll(error),
            "feed");
  EXPECT_EQ(downloadAnswer(HTTPTestServer::response("media")).back(), "finished");
  EXPECT_EQ(downloadAnswer(HTTPTestServer::response("media")).back(), "finished");
  EXPECT_EQ(server_.connections(), 1);
}

TEST_F(DownloadTest, ManySmallFilesAreQuick) {
  const auto begin = std::chrono::steady_clock::now();
  for (int i = 0; i < 50; ++i) {
    ASSERT_EQ(downloadAnswer(HTTPTestServer::response("media")).back(), "finished");
  }
  // Half of what they would take if each waited for a delayed acknowledgement of 40 ms.
  EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(1));
  EXPECT_EQ(server_.connections(), 1);
}

TEST_F(DownloadTest, FailureLeavesTheExistingFileAlone) {
  directory_.addFile("media.mp3", "old");
  EXPECT_THAT(downloadAnswer("HTTP/1.1 200 OK\r\nContent-Length: 9\r\n\r\nmedia", true),
              ElementsAre("response 9", "data 5",
                          "failed: transfer 18: transfer closed with 4 bytes remaining to read"));
  server_.serve("/reset", [](Connection& connection) {
    connection.send("HTTP/1.1 200 OK\r\n\r\nmedia");
    connection.reset();
  });
  EXPECT_THAT(download(server_.url("/reset")),
              ElementsAre("response -1", "data 5",
                          "failed: transfer 56: Recv failure: Connection reset by peer"));
  EXPECT_EQ(contentOf(destination_), "old");
  EXPECT_THAT(directory_.names(), ElementsAre("media.mp3"));
}

TEST_F(DownloadTest, FailedStatusBringsNoResponse) {
  for (const std::string status : {"206", "404"}) {
    EXPECT_THAT(downloadAnswer(HTTPTestServer::response("sorry", "", status + " Text")),
                ElementsAre("failed: HTTP " + status + ": HTTP status " + status));
  }
  EXPECT_THAT(directory_.names(), ElementsAre());
}

TEST_F(DownloadTest, OtherSchemesFailInTheEventLoop) {
  EXPECT_THAT(download("ftp://127.0.0.1/a"),
              ElementsAre("failed: transfer 1: URLs of the scheme \"ftp\" are not supported"));
}

TEST_F(DownloadTest, MissingDirectoryIsAFailure) {
  server_.serve("/media", HTTPTestServer::response("media"));
  EXPECT_THAT(download(server_.url("/media"), directory_ / "none/media.mp3"),
              ElementsAre("failed: POSIX 2: No such file or directory"));
  EXPECT_THAT(
      download(fileURLText(directory_.addFile("source", "media")), directory_ / "none/media.mp3"),
      ElementsAre("failed: POSIX 2: No such file or directory"));
}

TEST_F(DownloadTest, FileThatCannotBeReadToItsEndIsAFailure) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  const std::string source = directory_.addFile("source", "media");
  EXPECT_TRUE(holdsInChild([&] {
    return refuseSystemCall(SYS_read, EIO) &&
           download(fileURLText(source)) ==
               std::vector<std::string>{"response 5", "failed: POSIX 5: Input/output error"};
  }));
  EXPECT_THAT(directory_.names(), ElementsAre("source"));
}

TEST_F(DownloadTest, DirectoryAtTheDestinationIsAFailure) {
  std::filesystem::create_directory(destination_);
  EXPECT_THAT(downloadAnswer(HTTPTestServer::response("media")),
              ElementsAre("response 5", "data 5", "failed: POSIX 21: Is a directory"));
  EXPECT_TRUE(std::filesystem::is_directory(destination_));
  EXPECT_THAT(directory_.names(), ElementsAre("media.mp3"));
}

TEST_F(DownloadTest, FullDiskIsAFailure) {
  server_.serve("/media", HTTPTestServer::response("media"));
  // A limit on the size of files stands for the disk.
  EXPECT_TRUE(holdsInChild([&] {
    ::signal(SIGXFSZ, SIG_IGN);
    const rlimit limit{3, 3};
    ::setrlimit(RLIMIT_FSIZE, &limit);
    return download(server_.url("/media")).back() == "failed: POSIX 27: File too large";
  }));
  EXPECT_THAT(directory_.names(), ElementsAre());
}

TEST_F(DownloadTest, CancellingLeavesNothing) {
  server_.serve("/stalled", [](Connection& connection) {
    connection.send("HTTP/1.1 200 OK\r\nContent-Length: 9\r\n\r\nmedia");
  });
  Recorder recorder;
  {
    const Download download(urlOf(server_.url("/stalled")), destination_, recorder);
    while (recorder.total < 5) ASSERT_TRUE(runEventLoopOnce());
    EXPECT_EQ(directory_.names().size(), 1U);
  }
  EXPECT_THAT(recorder.events, ElementsAre("response 9", "data 5"));
  EXPECT_THAT(directory_.names(), ElementsAre());
  EXPECT_FALSE(runEventLoopOnce());
  EXPECT_EQ(downloadAnswer(HTTPTestServer::response("media")).back(), "finished");
}

TEST_F(DownloadTest, ReceiverMayDestroyTheDownloadInAnyEvent) {
  server_.serve("/good", HTTPTestServer::response("media"));
  const std::string file = directory_.addFile("source", "media");
  for (const std::string& url :
       {server_.url("/good"), server_.url("/missing"), fileURLText(file), fileURLText("/none")}) {
    const std::size_t eventCount = download(url).size();
    for (std::size_t last = 1; last <= eventCount; ++last) {
      std::filesystem::remove(destination_);
      Recorder recorder;
      auto download = std::make_unique<Download>(urlOf(url), destination_, recorder);
      recorder.atEvent = [&] {
        if (recorder.events.size() == last) download.reset();
      };
      while (download && runEventLoopOnce()) continue;
      EXPECT_EQ(recorder.events.size(), last) << url;
      EXPECT_FALSE(runEventLoopOnce());
      EXPECT_EQ(std::filesystem::exists(destination_), recorder.events.back() == "finished");
    }
  }
  EXPECT_THAT(directory_.names(), UnorderedElementsAre("source"));
}

TEST_F(DownloadTest, ReceiverMayStartTheNextDownloadInItsLastEvent) {
  server_.serve("/1", HTTPTestServer::response("one"));
  server_.serve("/2", HTTPTestServer::response("two"));
  Recorder first;
  Recorder second;
  std::unique_ptr<Download> next;
  const Download download(urlOf(server_.url("/1")), destination_, first);
  first.atEvent = [&] {
    if (!first.ended) return;
    next = std::make_unique<Download>(urlOf(server_.url("/2")), directory_ / "2", second);
    while (!second.ended && runEventLoopOnce()) continue;
  };
  while (!first.ended && runEventLoopOnce()) continue;
  EXPECT_THAT(second.events, ElementsAre("response 3", "data 3", "finished"));
  EXPECT_EQ(contentOf(destination_), "one");
  EXPECT_EQ(contentOf(directory_ / "2"), "two");
  EXPECT_EQ(server_.connections(), 1);
}

TEST_F(DownloadTest, CopiesAFile) {
  directory_.addFile("media.mp3", "old");
  EXPECT_THAT(download(fileURLText(directory_.addFile("a source \u00E9", "media"))),
              ElementsAre("response 5", "data 5", "finished"));
  EXPECT_EQ(contentOf(destination_), "media");
  EXPECT_THAT(download(fileURLText(directory_.addFile("empty", ""))),
              ElementsAre("response 0", "finished"));
  EXPECT_EQ(contentOf(destination_), "");
  EXPECT_EQ(directory_.names().size(), 3U);
}

TEST_F(DownloadTest, CopiesALargeFileInSeveralEvents) {
  std::string body;
  while (body.size() < 5'000'000) body += std::to_string(body.size());
  const std::string size = std::to_string(body.size());
  const std::string source = directory_.addFile("large", body);
  Recorder recorder;
  const Download download(urlOf(fileURLText(source)), destination_, recorder);
  while (!recorder.ended && runEventLoopOnce()) continue;
  EXPECT_THAT(recorder.events, ElementsAre("response " + size, "data " + size, "finished"));
  EXPECT_GE(recorder.dataEvents, 5);
  EXPECT_TRUE(contentOf(destination_) == body);
}

TEST_F(DownloadTest, CopiesAFileOntoItself) {
  directory_.addFile("media.mp3", "media");
  EXPECT_EQ(download(fileURLText(destination_)).back(), "finished");
  EXPECT_EQ(contentOf(destination_), "media");
}

TEST_F(DownloadTest, FileThatBecomesShorterIsAFailure) {
  const std::string source = directory_.addFile("source", std::string(1'000'000, 'x'));
  Recorder recorder;
  const Download download(urlOf(fileURLText(source)), destination_, recorder);
  while (recorder.total == 0) ASSERT_TRUE(runEventLoopOnce());
  std::filesystem::resize_file(source, 10);
  while (!recorder.ended && runEventLoopOnce()) continue;
  EXPECT_EQ(recorder.events.back(), "failed: transfer 18: The file changed while it was read");
  EXPECT_THAT(directory_.names(), ElementsAre("source"));
}

TEST_F(DownloadTest, FileThatIsCutAndFilledAgainIsAFailure) {
  const std::string source = directory_.addFile("source", std::string(1'000'000, 'x'));
  std::filesystem::last_write_time(source, std::filesystem::file_time_type());
  Recorder recorder;
  const Download download(urlOf(fileURLText(source)), destination_, recorder);
  while (recorder.total == 0) ASSERT_TRUE(runEventLoopOnce());
  directory_.addFile("source", std::string(1'000'000, 'y'));
  while (!recorder.ended && runEventLoopOnce()) continue;
  EXPECT_EQ(recorder.events.back(), "failed: transfer 18: The file changed while it was read");
  EXPECT_THAT(directory_.names(), ElementsAre("source"));
}

TEST_F(DownloadTest, NothingButARegularFileIsCopied) {
  const std::string fifo = directory_ / "fifo";
  ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
  const std::vector<std::pair<std::string, std::string>> rows = {
      {fileURLText(fifo), "failed: POSIX 22: Not a regular file"},
      {"file:///dev/zero", "failed: POSIX 22: Not a regular file"},
      {"file:///dev/null", "failed: POSIX 22: Not a regular file"},
      {fileURLText(directory_.path()), "failed: POSIX 21: Is a directory"},
      {fileURLText(directory_ / "none"), "failed: POSIX 2: No such file or directory"},
      {"file:///etc/passwd%00.mp3", "failed: POSIX 22: Invalid argument"},
  };
  for (const auto& [url, event] : rows) EXPECT_THAT(download(url), ElementsAre(event)) << url;
  EXPECT_THAT(directory_.names(), ElementsAre("fifo"));
}

}  // namespace
}  // namespace platform
