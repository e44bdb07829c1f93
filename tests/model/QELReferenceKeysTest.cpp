#include "model/QELReferenceKeys.h"

#include <gtest/gtest.h>

#include <string>

namespace {

std::string likeliest(std::string_view name, bool isOfEpisode) {
  const QELReferenceKey* const key = QELLikeliestReferenceKey(name, isOfEpisode);
  return key ? std::string(key->name) : "";
}

TEST(QELReferenceKeysTest, KeysAreKnownByName) {
  ASSERT_NE(QELReferenceKeyNamed("EpisodeDate"), nullptr);
  EXPECT_EQ(QELReferenceKeyNamed("EpisodeDate")->kind, "a date");
  EXPECT_TRUE(QELReferenceKeyNamed("EpisodeDate")->isOfEpisode());
  EXPECT_FALSE(QELReferenceKeyNamed("Episodes")->isOfEpisode());
  EXPECT_FALSE(QELReferenceKeyNamed("PodcastOrigin")->isOfEpisode());
  EXPECT_EQ(QELReferenceKeyNamed("episodedate"), nullptr);
}

TEST(QELReferenceKeysTest, AMisspeltKeyIsLikeOneOfItsOwner) {
  EXPECT_EQ(likeliest("PodcastNmae", false), "PodcastName");
  EXPECT_EQ(likeliest("podcastname", false), "PodcastName");
  EXPECT_EQ(likeliest("EpisodeDay", true), "EpisodeDate");
  EXPECT_EQ(likeliest("EpisodesName", true), "EpisodeName");
  EXPECT_EQ(likeliest("Episode", false), "Episodes");
  EXPECT_EQ(likeliest("EpisodeDay", false), "");
  EXPECT_EQ(likeliest("EpisodeTitle", true), "");
  EXPECT_EQ(likeliest("PodcastDate", false), "");  // a key of episodes alone, and no PodcastName
  EXPECT_EQ(likeliest("", true), "");
  EXPECT_EQ(likeliest(std::string(1000000, 'x'), true), "");
}

}  // namespace
