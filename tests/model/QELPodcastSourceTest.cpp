#include "model/QELPodcastSource.h"

#include <gtest/gtest.h>

#include "model/QELPodcastKeys.h"

namespace {

using platform::Text;

TEST(QELPodcastSourceTest, EveryFieldIsAbsentAtFirst) {
  const QELPodcastSource source;
  for (const QELPodcastKey& field : QELPodcastKeys()) {
    EXPECT_EQ((source.*field.value)(), std::nullopt) << field.key;
  }
  EXPECT_EQ(source.episodes(), nullptr);
  EXPECT_EQ(source.allowedPosterFileTypes(), std::nullopt);
  EXPECT_EQ(source.allowedEpisodeFileTypes(), std::nullopt);
}

TEST(QELPodcastSourceTest, AbstractLoadFailsWithCodeOne) {
  QELPodcastSource source;
  platform::ErrorSlot error;
  EXPECT_FALSE(source.loadSourceWithError(error));
  EXPECT_EQ(error, (platform::ErrorRecord{"QELDomain", 1, "Attempt to load an abstract source"}));
}

TEST(QELPodcastSourceTest, EachFieldHoldsWhatWasSet) {
  QELPodcastSource source;
  for (const QELPodcastKey& field : QELPodcastKeys()) {
    (source.*field.setValue)(Text("value of " + std::string(field.key)));
  }
  for (const QELPodcastKey& field : QELPodcastKeys()) {
    EXPECT_EQ((source.*field.value)(), Text("value of " + std::string(field.key)));
  }
}

TEST(QELPodcastSourceTest, TextsAreCopiedWhenTheyAreSet) {
  QELPodcastSource source;
  std::string title = "before";
  source.setTitle(Text(title));
  title = "after";
  EXPECT_EQ(source.title(), "before");
}

TEST(QELPodcastSourceTest, EpisodeListIsKeptItself) {
  QELPodcastSource source;
  const auto episodes = std::make_shared<QELEpisodeList>();
  source.setEpisodes(episodes);
  episodes->push_back(QELEpisode::episode());
  EXPECT_EQ(source.episodes(), episodes);
  EXPECT_EQ(source.episodes()->size(), 1U);
}

TEST(QELPodcastSourceTest, FileTypeListsAreCopied) {
  QELPodcastSource source;
  QELPodcastSource::FileTypes types{"mp3"};
  source.setAllowedEpisodeFileTypes(types);
  types.insert("m4a");
  EXPECT_EQ(source.allowedEpisodeFileTypes(), QELPodcastSource::FileTypes{"mp3"});
}

}  // namespace
