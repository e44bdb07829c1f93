#include "companions/transfers/QELFetch.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <utility>

#include "platform/net/EventLoop.h"
#include "tests/support/HTTPTestServer.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

using Connection = HTTPTestServer::Connection;
using State = QELFetch::State;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

class QELFetchTest : public testing::Test {
 protected:
  QELFetch fetchOf(const std::string& location, const std::string& type) {
    return {"\"One\"", QELMediaReference(location, type), platform::FilePlace(open_, "1.mp3"),
            directory_.path(), true};
  }
  QELFetch download() { return fetchOf(server_.url("/"), "remote"); }

  /// Serves these bytes and then ends the connection.
  void serve(const std::string& bytes) {
    server_.serve("/", [bytes](Connection& connection) {
      connection.send(bytes);
      connection.close();
    });
  }
  /// Starts it, and leaves it when its first five bytes are there.
  static void begin(QELFetch& fetch) {
    fetch.start(5);
    while (fetch.progress().received < 5 && platform::runEventLoopOnce()) continue;
  }
  static void run(QELFetch& fetch) {
    fetch.start(5);
    while (fetch.state() == State::kRunning && platform::runEventLoopOnce()) continue;
  }

  HTTPTestServer server_;
  TemporaryDirectory directory_;
  platform::ErrorSlot error_;
  platform::Directory open_ = std::move(*platform::Directory::open(directory_.path(), error_));
};

constexpr const char* kHalf = "HTTP/1.1 200 OK\r\nContent-Length: 10\r\n";

TEST_F(QELFetchTest, ALocalFileIsCopiedAtOnce) {
  const TemporaryDirectory elsewhere;
  QELFetch fetch = fetchOf(elsewhere.addFile("a", "whole"), "local");
  EXPECT_EQ(fetch.state(), State::kWaiting);
  fetch.start(5);
  EXPECT_EQ(fetch.state(), State::kDone);
  EXPECT_EQ(fetch.size(), 5U);
  EXPECT_EQ(contentOf(directory_ / "1.mp3"), "whole");
}

TEST_F(QELFetchTest, ALocalFileThatCannotBeCopiedFails) {
  QELFetch missing = fetchOf(directory_ / "missing", "local");
  missing.start(5);
  EXPECT_EQ(missing.state(), State::kFailed);
  EXPECT_EQ(missing.cause(), "No such file or directory");
  QELFetch itself = fetchOf(directory_.addFile("1.mp3", "whole"), "local");
  itself.start(5);
  EXPECT_EQ(itself.state(), State::kFailed);
  EXPECT_EQ(itself.cause(), "File exists");
  EXPECT_EQ(contentOf(directory_ / "1.mp3"), "whole");
}

TEST_F(QELFetchTest, OneThatIsCancelledGoesOnWithItsPart) {
  server_.serve("/", std::string(kHalf) + "ETag: \"v\"\r\n\r\nfirst");
  QELFetch fetch = download();
  begin(fetch);
  fetch.cancel();
  EXPECT_EQ(fetch.state(), State::kWaiting);
  EXPECT_FALSE(platform::runEventLoopOnce());
  EXPECT_EQ(contentOf(directory_ / fetch.partName()), "first");

  server_.serve(
      "/", "HTTP/1.1 206 Part\r\nContent-Range: bytes 5-9/10\r\nContent-Length: 5\r\n\r\n last");
  QELFetch second = download();
  run(second);
  EXPECT_EQ(second.state(), State::kDone);
  EXPECT_THAT(server_.requests().back(), HasSubstr("\r\nIf-Range: \"v\"\r\n"));
  EXPECT_EQ(contentOf(directory_ / "1.mp3"), "first last");
}

TEST_F(QELFetchTest, WhatAppearsMeanwhileUnderTheNameStays) {
  server_.serve("/", [this](Connection& connection) {
    directory_.addFile("1.mp3", "of another program");
    connection.send(std::string(kHalf) + "\r\nfirst last");
  });
  QELFetch fetch = download();
  run(fetch);
  EXPECT_EQ(fetch.state(), State::kFailed);
  EXPECT_EQ(fetch.cause(), "File exists");
  EXPECT_EQ(contentOf(directory_ / "1.mp3"), "of another program");
}

TEST_F(QELFetchTest, OneThatIsCancelledLeavesNoPartThatNothingVouchesFor) {
  server_.serve("/", std::string(kHalf) + "\r\nfirst");
  QELFetch fetch = download();
  begin(fetch);
  EXPECT_EQ(contentOf(directory_ / fetch.partName()), "first");
  fetch.cancel();
  EXPECT_THAT(directory_.names(), IsEmpty());
}

TEST_F(QELFetchTest, OneThatIsNotRunningLosesNothingByBeingCancelled) {
  serve(std::string(kHalf) + "ETag: \"v\"\r\n\r\nfirst");
  QELFetch fetch = download();
  run(fetch);
  EXPECT_EQ(fetch.state(), State::kWaiting);
  QELFetch again = download();  // knows no validator yet
  again.cancel();
  EXPECT_EQ(again.state(), State::kWaiting);
  EXPECT_EQ(contentOf(directory_ / again.partName()), "first");
}

TEST_F(QELFetchTest, ARestThatIsCutKeepsWhatVouchesForThePart) {
  serve(std::string(kHalf) + "ETag: \"v\"\r\n\r\nfir");
  QELFetch fetch = download();
  run(fetch);
  serve("HTTP/1.1 206 Part\r\nContent-Range: bytes 3-9/10\r\nContent-Length: 7\r\n\r\nst");
  run(fetch);
  EXPECT_EQ(fetch.state(), State::kWaiting);
  EXPECT_EQ(fetch.progress().resumed, 3U);
  EXPECT_EQ(fetch.progress().total, 10U);
  serve("HTTP/1.1 206 Part\r\nContent-Range: bytes 5-9/10\r\nContent-Length: 5\r\n\r\n last");
  run(fetch);
  EXPECT_EQ(fetch.state(), State::kDone);
  EXPECT_THAT(server_.requests().back(), HasSubstr("\r\nRange: bytes=5-\r\nIf-Range: \"v\"\r\n"));
  EXPECT_EQ(contentOf(directory_ / "1.mp3"), "first last");
}

TEST_F(QELFetchTest, WithoutAValidatorAPartIsOfNoUse) {
  serve(std::string(kHalf) + "\r\nfirst");
  QELFetch fetch = download();
  run(fetch);
  EXPECT_EQ(fetch.state(), State::kWaiting);
  EXPECT_THAT(directory_.names(), IsEmpty());
  serve(HTTPTestServer::response("first last"));
  run(fetch);
  EXPECT_EQ(contentOf(directory_ / "1.mp3"), "first last");
  EXPECT_THAT(server_.requests().back(), Not(HasSubstr("Range:")));
}

TEST_F(QELFetchTest, OneThatForgoesItsPartLeavesNothing) {
  serve(std::string(kHalf) + "ETag: \"v\"\r\n\r\nfirst");
  QELFetch fetch = download();
  const std::string part = directory_.addFile(fetch.partName(), "of another");
  fetch.forgoPart();
  EXPECT_EQ(fetch.partName(), "");
  run(fetch);
  EXPECT_EQ(fetch.state(), State::kWaiting);
  EXPECT_EQ(contentOf(part), "of another");
  EXPECT_EQ(directory_.names().size(), 1U);
}

TEST_F(QELFetchTest, ALengthThatIsNotAnnouncedIsNotKnown) {
  serve("HTTP/1.1 200 OK\r\n\r\nwhole");
  QELFetch fetch = download();
  run(fetch);
  EXPECT_EQ(fetch.state(), State::kDone);
  EXPECT_EQ(fetch.progress().total, std::nullopt);
  EXPECT_EQ(fetch.size(), 5U);
}

}  // namespace
