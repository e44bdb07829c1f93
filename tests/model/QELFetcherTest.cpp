#include "model/QELFetcher.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <string>

#include "cli/common/QELProgress.h"
#include "model/QELEpisode.h"
#include "model/QELPodcastSource.h"
#include "tests/support/HTTPTestServer.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

using platform::Text;

/// Fetches through the records that receive the downloads' events, and what they print of it.
class QELFetcherTest : public testing::Test {
 protected:
  QELFetcherTest() : file_(directory_.addFile("file", "content")), target_(directory_ / "target") {
    QELShouldReportProgress = true;
    podcast_.setTitle("P");
    episode_->setTitle("E");
  }

  /// What the fetch, which must end this way, prints.
  template <typename Fetch>
  static std::string printed(bool succeeds, Fetch fetch) {
    testing::internal::CaptureStdout();
    const bool succeeded = fetch();
    QELProgress("N", ".");  // ends a line that was drawn in place
    std::fflush(stdout);
    EXPECT_EQ(succeeded, succeeds);
    std::string output = testing::internal::GetCapturedStdout();
    output.resize(output.size() - std::string("[N] .\n").size());
    return output;
  }
  std::string saveEpisode(bool succeeds) {
    return printed(succeeds, [&] { return episode_->saveToPath(target_); });
  }
  std::string saveEpisodePoster(bool succeeds) {
    return printed(succeeds, [&] { return episode_->savePosterToPath(target_); });
  }
  std::string savePodcastPoster(bool succeeds) {
    return printed(succeeds, [&] { return podcast_.savePosterToPath(target_); });
  }

  /// Gives the episode's media and all posters the location and the reference type.
  void setLocations(const Text& location, const platform::OptionalText& type) {
    episode_->setLocation(location);
    episode_->setReferenceType(type);
    episode_->setPosterLocation(location);
    episode_->setPosterReferenceType(type);
    podcast_.setPosterLocation(location);
    podcast_.setPosterReferenceType(type);
  }

  TemporaryDirectory directory_;
  const std::string file_;
  const std::string target_;
  HTTPTestServer server_;
  QELPodcastSource podcast_;
  std::shared_ptr<QELEpisode> episode_ = QELEpisode::episode();
};

TEST_F(QELFetcherTest, WithoutLocationNothingIsFetched) {
  episode_->setReferenceType("remote");
  EXPECT_EQ(saveEpisode(false), "");
  EXPECT_EQ(saveEpisodePoster(false), "");
  EXPECT_EQ(savePodcastPoster(false), "");
}

TEST_F(QELFetcherTest, AnythingButRemoteIsCopied) {
  for (const platform::OptionalText& type :
       {platform::OptionalText("local"), platform::OptionalText("Remote"), platform::OptionalText(),
        platform::OptionalText("")}) {
    setLocations(Text(file_), type);
    EXPECT_EQ(savePodcastPoster(true), "");
    EXPECT_EQ(contentOf(target_), "content");
    std::remove(target_.c_str());
    setLocations(Text(server_.url("/media")), type);
    EXPECT_EQ(saveEpisode(false), "");
  }
  EXPECT_EQ(server_.connections(), 0);
}

TEST_F(QELFetcherTest, CopyDoesNotOverwriteAndDownloadDoes) {
  directory_.addFile("target", "earlier");
  setLocations(Text(file_), "local");
  EXPECT_EQ(saveEpisode(false), "");
  EXPECT_EQ(contentOf(target_), "earlier");

  setLocations(Text("file://" + file_), "remote");
  EXPECT_EQ(saveEpisode(true),
            "[N] Downloading episode entitled \"E\" (0 bytes)...\n  -- 7 / 7 (100.0%)\n");
  EXPECT_EQ(contentOf(target_), "content");
}

TEST_F(QELFetcherTest, RemoteLocationThatIsNoURLFailsSilently) {
  for (const char* location : {"http://a b/", "nothing", ""}) {
    setLocations(location, "remote");
    EXPECT_EQ(saveEpisode(false), "") << location;
    EXPECT_EQ(savePodcastPoster(false), "") << location;
  }
}

TEST_F(QELFetcherTest, FailedDownloadPrintsItsNoticeOnly) {
  directory_.addFile("target", "earlier");
  episode_->setContentLength(7);
  setLocations(Text(server_.url("/missing")), "remote");
  EXPECT_EQ(saveEpisode(false), "[N] Downloading episode entitled \"E\" (7 bytes)...\n");
  EXPECT_EQ(episode_->contentLength(), 7U);
  EXPECT_EQ(saveEpisodePoster(false), "[N] Downloading poster for episode entitled \"E\"...\n");
  EXPECT_EQ(savePodcastPoster(false), "[N] Downloading poster for podcast entitled \"P\"...\n");
  EXPECT_EQ(contentOf(target_), "earlier");
}

TEST_F(QELFetcherTest, AFailureDoesNotLastUntilTheNextFetch) {
  setLocations(Text(server_.url("/missing")), "remote");
  saveEpisode(false);
  setLocations(Text("file://" + file_), "remote");
  saveEpisode(true);
  setLocations(Text(server_.url("/missing")), "remote");
  saveEpisode(false);
}

TEST_F(QELFetcherTest, NoticeShowsTheSizeKnownBeforeAndTheCounterTheAnnouncedOne) {
  server_.serve("/media", HTTPTestServer::response("12345"));
  episode_->setContentLength(77);
  setLocations(Text(server_.url("/media")), "remote");
  EXPECT_EQ(saveEpisode(true),
            "[N] Downloading episode entitled \"E\" (77 bytes)...\n  -- 5 / 5 (100.0%)\n");
  EXPECT_EQ(episode_->contentLength(), 5U);
  // The counter of each fetch begins at 0.
  EXPECT_EQ(saveEpisode(true),
            "[N] Downloading episode entitled \"E\" (5 bytes)...\n  -- 5 / 5 (100.0%)\n");
}

TEST_F(QELFetcherTest, UnknownLengthsLeaveTheCounterOut) {
  server_.serve("/media", [](HTTPTestServer::Connection& connection) {
    connection.send("HTTP/1.1 200 OK\r\n\r\n12345");
    connection.close();
  });
  setLocations(Text(server_.url("/media")), "remote");
  EXPECT_EQ(saveEpisode(true), "[N] Downloading episode entitled \"E\" (0 bytes)...\n");
  EXPECT_EQ(episode_->contentLength(), 0U);

  // The size of the source stays, and more bytes than that are all of them.
  episode_->setContentLength(2);
  EXPECT_EQ(saveEpisode(true),
            "[N] Downloading episode entitled \"E\" (2 bytes)...\n  -- 5 / 2 (100.0%)\n");
  EXPECT_EQ(episode_->contentLength(), 2U);
}

TEST_F(QELFetcherTest, PostersAreDownloadedWithoutACounter) {
  server_.serve("/poster", HTTPTestServer::response("123"));
  episode_->setContentLength(77);
  setLocations(Text(server_.url("/poster")), "remote");
  EXPECT_EQ(saveEpisodePoster(true), "[N] Downloading poster for episode entitled \"E\"...\n");
  EXPECT_EQ(episode_->contentLength(), 3U);  // that of the poster
  std::remove(target_.c_str());
  EXPECT_EQ(savePodcastPoster(true), "[N] Downloading poster for podcast entitled \"P\"...\n");
  EXPECT_EQ(contentOf(target_), "123");
}

}  // namespace
