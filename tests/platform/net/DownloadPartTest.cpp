#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <chrono>
#include <filesystem>
#include <memory>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>

#include "platform/net/Download.h"
#include "platform/net/EventLoop.h"
#include "tests/support/GzipSamples.h"
#include "tests/support/HTTPTestServer.h"
#include "tests/support/TemporaryDirectory.h"

namespace platform {
namespace {

using Connection = HTTPTestServer::Connection;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

const std::string kTag = "ETag: \"v1\"\r\n";

/// Writes down what a download tells.
class Recorder : public DownloadReceiver {
 public:
  std::string events;
  DownloadAnswer answer;
  bool ended = false;
  bool isLost = false;

  void didReceiveResponse(Download& download, std::int64_t expectedLength) override {
    events += "response " + std::to_string(expectedLength) + " from " +
              std::to_string(download.resumedLength());
  }
  void didReceiveDataOfLength(Download&, std::uint64_t length) override { received += length; }
  void downloadDidFinish(Download& download) override { end(download, ", finished"); }
  void didFailWithError(Download& download, const ErrorRecord& error) override {
    isLost = isLostConnection(error);
    end(download, ", failed: " + error.description);
  }

 private:
  void end(const Download& download, const std::string& how) {
    if (received > 0) events += ", data " + std::to_string(received);
    events += how;
    answer = download.answer();
    ended = true;
  }

  std::uint64_t received = 0;
};

class DownloadPartTest : public ::testing::Test {
 protected:
  Recorder download(const std::string& path, DownloadOptions options) {
    Recorder recorder;
    const Download download(*URL::parse(server_.url(path)), {open_, "media"}, recorder,
                            std::move(options));
    while (!recorder.ended && runEventLoopOnce()) continue;
    return recorder;
  }
  static DownloadOptions part(std::string validator) {
    return {.partName = "part", .partValidator = std::move(validator)};
  }
  /// Serves "whole media", and the answer to whoever asks for a range.
  void serve(const std::string& path, std::string answer) {
    server_.serve(path, [answer = std::move(answer)](Connection& connection) {
      const bool isAskedForRange = connection.request().find("\r\nRange: ") != std::string::npos;
      connection.send(isAskedForRange ? answer : HTTPTestServer::response("whole media", kTag));
    });
  }
  static std::string rest(const std::string& fields, const std::string& body = " media",
                          const std::string& range = "bytes 5-10/11") {
    return HTTPTestServer::response(body, "Content-Range: " + range + "\r\n" + fields,
                                    "206 Partial Content");
  }

  HTTPTestServer server_;
  TemporaryDirectory directory_;
  ErrorSlot error_;
  Directory open_ = std::move(*Directory::open(directory_.path(), error_));
};

TEST_F(DownloadPartTest, AFailureLeavesThePartAndTheNextGoesOnBehindIt) {
  server_.serve("/", [](Connection& connection) {
    connection.send("HTTP/1.1 200 OK\r\nContent-Length: 11\r\n" + kTag + "\r\nwhole");
    connection.close();
  });
  const Recorder first = download("/", part(""));
  EXPECT_EQ(first.events,
            "response 11 from 0, data 5, failed: transfer closed with 6 bytes "
            "remaining to read");
  EXPECT_TRUE(first.isLost);
  EXPECT_EQ(first.answer.validator, "\"v1\"");
  EXPECT_EQ(contentOf(directory_ / "part"), "whole");
  EXPECT_THAT(directory_.names(), ElementsAre("part"));

  server_.serve("/", rest(kTag));
  EXPECT_EQ(download("/", part(first.answer.validator)).events,
            "response 11 from 5, data 6, finished");
  EXPECT_THAT(server_.requests().back(), HasSubstr("\r\nRange: bytes=5-\r\nIf-Range: \"v1\"\r\n"));
  EXPECT_EQ(contentOf(directory_ / "media"), "whole media");
  EXPECT_THAT(directory_.names(), ElementsAre("media"));
}

TEST_F(DownloadPartTest, TheRestMayComeAfterARedirectAndWithoutFieldsOfTheWhole) {
  directory_.addFile("part", "whole");
  server_.serve("/", HTTPTestServer::redirect("/rest"));
  serve("/rest", rest(""));
  EXPECT_EQ(download("/", part("\"v1\"")).events, "response 11 from 5, data 6, finished");
  directory_.addFile("part", "whole");
  serve("/rest", rest("Last-Modified: then\r\nETag: \"other\"\r\n"));
  EXPECT_EQ(download("/", part("then")).events, "response 11 from 5, data 6, finished");
}

TEST_F(DownloadPartTest, WhatIsNotTheRestOfTheSameFileIsAskedForFromTheStart) {
  const std::string chunks =
      "HTTP/1.1 206 Part\r\nTransfer-Encoding: chunked\r\nContent-Range: bytes 5-10/11\r\n\r\n"
      "6\r\n media\r\n0\r\n\r\n";
  // As a signed number the end is negative.
  const std::string beyondAllSizes =
      "HTTP/1.1 206 Part\r\nContent-Length: 9223372036854775807\r\n"
      "Content-Range: bytes 5-9223372036854775811/9223372036854775812\r\n\r\n media";
  const std::vector<std::string> answers = {
      HTTPTestServer::response("whole media", kTag),
      HTTPTestServer::response("", "Content-Range: bytes */5\r\n", "416 Range Not Satisfiable"),
      rest("", " media", "bytes 4-9/11"),
      rest("", " media", "bytes 5-10/12"),
      rest("", " media", "bytes 5-10/*"),
      rest("", " medi", "bytes 5-10/11"),
      rest("", "", "bytes 5-4/5"),
      rest("", " media", "items 5-10/11"),
      rest("ETag: \"v2\"\r\n"),
      rest("ETag: W/\"v1\"\r\n"),
      rest("Content-Encoding: gzip\r\n"),
      HTTPTestServer::response(" media", "", "206 Partial Content"),
      chunks,
      beyondAllSizes,
  };
  for (const std::string& answer : answers) {
    directory_.addFile("part", "other");
    serve("/", answer);
    EXPECT_EQ(download("/", part("\"v1\"")).events, "response 11 from 0, data 11, finished")
        << answer;
    EXPECT_EQ(contentOf(directory_ / "media"), "whole media");
    EXPECT_THAT(directory_.names(), ElementsAre("media"));
  }
}

TEST_F(DownloadPartTest, WithoutAnOpenDirectoryItBeginsAnew) {
  directory_.addFile("part", "whole");
  serve("/", rest(kTag));
  Recorder recorder;
  const Download download(*URL::parse(server_.url("/")), FilePlace(directory_ / "media"), recorder,
                          part("\"v1\""));
  while (!recorder.ended && runEventLoopOnce()) continue;
  EXPECT_EQ(recorder.events, "response 11 from 0, data 11, finished");
  EXPECT_EQ(contentOf(directory_ / "media"), "whole media");
}

TEST_F(DownloadPartTest, AFailedStatusLeavesThePartAsItIs) {
  directory_.addFile("part", "whole");
  server_.serve("/", HTTPTestServer::response("", "Retry-After: 120\r\n" + kTag, "503 Busy"));
  const Recorder recorder = download("/", part("\"v1\""));
  EXPECT_EQ(recorder.events, ", failed: HTTP status 503");
  EXPECT_FALSE(recorder.isLost);
  EXPECT_EQ(recorder.answer.retryAfter, "120");
  EXPECT_EQ(recorder.answer.validator, "");
  EXPECT_EQ(contentOf(directory_ / "part"), "whole");
}

TEST_F(DownloadPartTest, CancellingLeavesThePart) {
  server_.serve("/", "HTTP/1.1 200 OK\r\nContent-Length: 11\r\n\r\nwhole");
  Recorder recorder;
  auto download = std::make_unique<Download>(*URL::parse(server_.url("/")),
                                             FilePlace(open_, "media"), recorder, part(""));
  while (!std::filesystem::exists(directory_ / "part") && runEventLoopOnce()) continue;
  download.reset();
  EXPECT_EQ(contentOf(directory_ / "part"), "whole");
  EXPECT_FALSE(runEventLoopOnce());
}

TEST_F(DownloadPartTest, APartThatIsALinkIsNotWrittenThrough) {
  server_.serve("/", HTTPTestServer::response("whole media"));
  for (const bool isSymbolic : {true, false}) {
    const std::string victim = directory_.addFile("victim", "whole");
    const std::string link = directory_ / "part";
    ASSERT_EQ(
        isSymbolic ? ::symlink(victim.c_str(), link.c_str()) : ::link(victim.c_str(), link.c_str()),
        0);
    EXPECT_EQ(download("/", part("")).events, "response 11 from 0, data 11, finished");
    EXPECT_EQ(contentOf(victim), "whole");
    EXPECT_EQ(contentOf(directory_ / "media"), "whole media");
  }
  ASSERT_EQ(::link((directory_ / "victim").c_str(), (directory_ / "part").c_str()), 0);
  serve("/", rest(kTag));
  EXPECT_EQ(download("/", part("\"v1\"")).events, ", failed: Invalid argument");
  EXPECT_EQ(contentOf(directory_ / "victim"), "whole");
}

TEST_F(DownloadPartTest, TellsWhatTheAnswerTellsAndWhatProvesTheFileToBeTheSame) {
  const std::string modified = "Last-Modified: Sun, 01 Nov 2026 10:00:00 GMT\r\n";
  const std::string date = "Date: Sun, 01 Nov 2026 10:00:01 GMT\r\n";
  const std::vector<std::pair<std::string, std::string>> rows = {
      {kTag + modified + date, "\"v1\""},
      {"ETag: W/\"v1\"\r\n" + modified + date, "Sun, 01 Nov 2026 10:00:00 GMT"},
      {modified + date, "Sun, 01 Nov 2026 10:00:00 GMT"},
      {modified + "Date: Sun, 01 Nov 2026 10:00:00 GMT\r\n", ""},
      {modified, ""},
      {"ETag: W/\"v1\"\r\n" + date, ""},
      {"", ""},
      {kTag + "Content-Encoding: gzip\r\n", ""},
  };
  for (const auto& [fields, validator] : rows) {
    server_.serve("/", HTTPTestServer::response(kGzipStream, "Content-Type: a/b\r\n" + fields));
    const Recorder recorder = download("/", {});
    EXPECT_EQ(recorder.answer.validator, validator) << fields;
    EXPECT_EQ(recorder.answer.contentType, "a/b");
    EXPECT_EQ(recorder.answer.retryAfter, "");
  }
}

TEST_F(DownloadPartTest, WhatIsThereIsReplacedOnlyWhereItMayBe) {
  directory_.addFile("media", "old");
  server_.serve("/", HTTPTestServer::response("new"));
  for (const std::string partName : {"", "part"}) {
    EXPECT_EQ(download("/", {.partName = partName, .replaces = false}).events,
              "response 3 from 0, data 3, failed: File exists");
    EXPECT_EQ(contentOf(directory_ / "media"), "old");
  }
  EXPECT_EQ(download("/", {.partName = "part"}).events, "response 3 from 0, data 3, finished");
  EXPECT_EQ(contentOf(directory_ / "media"), "new");
}

TEST_F(DownloadPartTest, AStallEndsItWhereItIsLimited) {
  server_.serve("/body", "HTTP/1.1 200 OK\r\nContent-Length: 11\r\n\r\nwhole");
  server_.serve("/header", "HTTP/1.1 200 OK\r\n");
  for (const std::string path : {"/body", "/header"}) {
    const auto begin = std::chrono::steady_clock::now();
    const Recorder recorder = download(path, {.stallLimit = 1});
    EXPECT_THAT(recorder.events, HasSubstr("failed: Operation too slow")) << path;
    EXPECT_TRUE(recorder.isLost);
    EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(10)) << path;
  }
}

TEST_F(DownloadPartTest, ManyRunAtOnce) {
  std::vector<std::string> names;
  for (const char c : std::string_view("abcdefghijkl")) names.emplace_back(1, c);
  for (const std::string& name : names) {
    server_.serve('/' + name, [name](Connection& connection) {
      std::this_thread::sleep_for(std::chrono::milliseconds(200));
      connection.send(HTTPTestServer::response("media " + name));
    });
  }
  const auto begin = std::chrono::steady_clock::now();
  std::vector<Recorder> recorders(names.size());
  std::vector<std::unique_ptr<Download>> downloads;
  for (std::size_t i = 0; i < names.size(); ++i) {
    downloads.push_back(std::make_unique<Download>(*URL::parse(server_.url('/' + names[i])),
                                                   FilePlace(open_, names[i]), recorders[i]));
  }
  while (runEventLoopOnce()) continue;
  // One after the other they would take 2.4 seconds.
  EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::milliseconds(1200));
  for (const std::string& name : names) EXPECT_EQ(contentOf(directory_ / name), "media " + name);
}

TEST(LostConnectionTest, IsToldFromOtherFailures) {
  for (const std::int64_t code : {5, 6, 7, 18, 28, 35, 52, 55, 56}) {
    EXPECT_TRUE(isLostConnection({"transfer", code, ""})) << code;
  }
  EXPECT_FALSE(isLostConnection({"transfer", 8, ""}));
  EXPECT_FALSE(isLostConnection({"transfer", 60, ""}));
  EXPECT_FALSE(isLostConnection({"POSIX", 28, ""}));
  EXPECT_FALSE(isLostConnection({"HTTP", 503, ""}));
}

}  // namespace
}  // namespace platform
