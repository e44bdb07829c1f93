#include "companions/keep/QELKeepDriver.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <string>
#include <system_error>
#include <thread>
#include <vector>

#include "companions/common/QELCommandLine.h"
#include "platform/files/StandardStreams.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/HTTPTestServer.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

class QELKeepDriverTest : public testing::Test {
 protected:
  /// Keeps a show of one episode in the bundle: the status.
  int run(const std::string& bundle) const {
    const std::string source = directory_.addFile(
        "show.plist",
        "<plist><dict><key>Episodes</key><array><dict><key>EpisodeName</key><string>One</string>"
        "<key>EpisodeReference</key><string>" +
            server_.url("/1.mp3") + "</string></dict></array></dict></plist>");
    const std::vector<const char*> words = {source.c_str(), bundle.c_str()};
    return QELRunKeep(words);
  }
  /// The same, and takes what is printed.
  int keep(const std::string& bundle) {
    testing::internal::CaptureStdout();
    testing::internal::CaptureStderr();
    const int status = run(bundle);
    platform::flushStandardOutput();
    output_ = testing::internal::GetCapturedStdout();
    errors_ = testing::internal::GetCapturedStderr();
    return status;
  }

  HTTPTestServer server_;
  TemporaryDirectory directory_;
  std::string output_;
  std::string errors_;
};

TEST_F(QELKeepDriverTest, ABundleThatCannotBeMadeIsNothingDone) {
  directory_.addFile("file", "");
  const std::string bundle = directory_ / "file/show.podcast";
  EXPECT_EQ(keep(bundle), kNothingDone);
  EXPECT_EQ(errors_, "qel-keep: " + bundle + ": Not a directory\n");
  EXPECT_EQ(server_.hits("/1.mp3"), 0);
}

TEST_F(QELKeepDriverTest, AListThatCannotBeWrittenInTheEndIsToldAndTheFileFoundAgain) {
  const std::string bundle = directory_ / "show.podcast";
  const std::string list = bundle + "/Info.plist";
  server_.serve("/1.mp3", [&list](HTTPTestServer::Connection& connection) {
    std::filesystem::remove(list);
    std::filesystem::create_directory(list);
    connection.send(HTTPTestServer::response("media"));
  });
  EXPECT_EQ(keep(bundle), kSomethingToLookAt);
  EXPECT_EQ(errors_, "qel-keep: could not write Info.plist: Is a directory\n");
  EXPECT_EQ(output_, "fetched \"One\": 1.mp3 (5 B)\n1 new, 0 known, 0 failed\n");
  EXPECT_EQ(contentOf(bundle + "/1.mp3"), "media");

  std::filesystem::remove(list);
  EXPECT_EQ(keep(bundle), kAllWell);
  EXPECT_EQ(errors_, "");
  EXPECT_EQ(server_.hits("/1.mp3"), 1);
  EXPECT_THAT(namesIn(bundle), testing::ElementsAre("1.mp3", "Info.plist", "Posters"));
}

/// The content of the one part in the bundle; empty when there is none yet.
std::string contentOfPart(const std::string& bundle) {
  std::error_code ignored;
  for (const auto& entry : std::filesystem::directory_iterator(bundle, ignored)) {
    const std::string path = entry.path().string();
    if (path.ends_with(".part") && path.find("/.qel-keep-") != std::string::npos) {
      return contentOf(path);
    }
  }
  return "";
}

TEST_F(QELKeepDriverTest, ASignalEndsItOnceWhatCameIsListedAndTheNextRunGoesOn) {
  server_.serve("/1.mp3", "HTTP/1.1 200 OK\r\nContent-Length: 10\r\nETag: \"v\"\r\n\r\nfirst");
  const std::string bundle = directory_ / "show.podcast";
  const std::string log = directory_ / "log";
  const int status = statusOfChild([&] {
    ::alarm(60);
    std::signal(SIGTERM, SIG_DFL);
    ::dup2(::open(log.c_str(), O_WRONLY | O_CREAT | O_APPEND, 0600), STDERR_FILENO);
    ::dup2(STDERR_FILENO, STDOUT_FILENO);
    std::thread([&] {
      while (contentOfPart(bundle) != "first") ::usleep(1000);
      ::kill(::getpid(), SIGTERM);
    }).detach();
    return run(bundle);
  });
  ASSERT_TRUE(WIFSIGNALED(status));
  EXPECT_EQ(WTERMSIG(status), SIGTERM);
  EXPECT_EQ(contentOf(log),
            "qel-keep: interrupted; the next run goes on\n0 new, 0 known, 0 failed\n");
  EXPECT_EQ(contentOfPart(bundle), "first");

  server_.serve(
      "/1.mp3",
      "HTTP/1.1 206 Part\r\nContent-Range: bytes 5-9/10\r\nContent-Length: 5\r\n\r\n last");
  EXPECT_EQ(keep(bundle), kAllWell);
  EXPECT_EQ(contentOf(bundle + "/1.mp3"), "first last");
  EXPECT_EQ(contentOfPart(bundle), "");
}

}  // namespace
