#include "companions/keep/QELKeepDriver.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

#include "companions/common/QELCommandLine.h"
#include "platform/files/StandardStreams.h"
#include "tests/support/HTTPTestServer.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

class QELKeepDriverTest : public testing::Test {
 protected:
  /// Keeps a show of one episode in the bundle; gives the status and takes what is printed.
  int keep(const std::string& bundle) {
    const std::string source = directory_.addFile(
        "show.plist",
        "<plist><dict><key>Episodes</key><array><dict><key>EpisodeName</key><string>One</string>"
        "<key>EpisodeReference</key><string>" +
            server_.url("/1.mp3") + "</string></dict></array></dict></plist>");
    const std::vector<const char*> words = {source.c_str(), bundle.c_str()};
    testing::internal::CaptureStdout();
    testing::internal::CaptureStderr();
    const int status = QELRunKeep(words);
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
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::directory_iterator(bundle)) {
    names.push_back(entry.path().filename().string());
  }
  EXPECT_THAT(names, testing::UnorderedElementsAre("Info.plist", "1.mp3", "Posters"));
}

}  // namespace
