#include "sources/QELReferenceFilePodcastSource.h"

#include <gtest/gtest.h>

#include "model/QELPodcastKeys.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

using platform::Dictionary;
using platform::PropertyListValue;

std::unique_ptr<QELReferenceFilePodcastSource> loaded(Dictionary dictionary) {
  auto source = QELReferenceFilePodcastSource::initWithDictionary(
      std::make_shared<const Dictionary>(std::move(dictionary)));
  platform::ErrorSlot error;
  EXPECT_TRUE(source->loadSourceWithError(error));
  EXPECT_EQ(error, std::nullopt);
  return source;
}

TEST(QELReferenceFilePodcastSourceTest, NoDictionaryGivesNoSource) {
  EXPECT_EQ(QELReferenceFilePodcastSource::initWithDictionary(nullptr), nullptr);
}

TEST(QELReferenceFilePodcastSourceTest, LoadWithoutDictionaryFailsWithCodeOne) {
  QELReferenceFilePodcastSource source(nullptr);
  platform::ErrorSlot error;
  EXPECT_FALSE(source.loadSourceWithError(error));
  EXPECT_EQ(error, (platform::ErrorRecord{"QELDomain", 1, "No reference file data was available"}));
}

TEST(QELReferenceFilePodcastSourceTest, TitleAloneLoads) {
  const auto source = loaded({{"PodcastName", "A show"}});
  for (const QELPodcastKey& field : QELPodcastKeys()) {
    const auto& value = (*source.*field.value)();
    EXPECT_EQ(value.has_value(), field.key == "PodcastName") << field.key;
  }
  EXPECT_EQ(source->title(), "A show");
  EXPECT_EQ(source->episodes(), nullptr);
}

TEST(QELReferenceFilePodcastSourceTest, EachKeyFillsItsField) {
  Dictionary dictionary{{"Unknown", "ignored"}};
  for (const QELPodcastKey& field : QELPodcastKeys()) {
    dictionary.emplace(std::string(field.key), "value of " + std::string(field.key));
  }
  const auto source = loaded(dictionary);
  for (const QELPodcastKey& field : QELPodcastKeys()) {
    EXPECT_EQ((*source.*field.value)(), platform::Text("value of " + std::string(field.key)));
  }
}

TEST(QELReferenceFilePodcastSourceTest, PodcastReferenceTypesAreNeverDerived) {
  const auto source = loaded({{"PodcastReference", "http://a.example/"},
                              {"PodcastPosterReference", "http://a.example/p.png"}});
  EXPECT_EQ(source->location(), "http://a.example/");
  EXPECT_EQ(source->referenceType(), std::nullopt);
  EXPECT_EQ(source->posterReferenceType(), std::nullopt);
}

TEST(QELReferenceFilePodcastSourceTest, EveryElementBecomesAnEpisodeInOrder) {
  const auto source = loaded({{"Episodes", PropertyListValue::Array{
                                               Dictionary{{"EpisodeName", "1"}},
                                               "no dictionary",
                                               Dictionary{{"EpisodeReference", "/media/a.mp3"}},
                                           }}});
  const auto& episodes = *source->episodes();
  ASSERT_EQ(episodes.size(), 3U);
  EXPECT_EQ(episodes[0]->title(), "1");
  EXPECT_EQ(episodes[1]->dictionary(), Dictionary());
  EXPECT_EQ(episodes[1]->orvaneOrder(), -1);
  EXPECT_EQ(episodes[2]->referenceType(), "local");
}

TEST(QELReferenceFilePodcastSourceTest, EmptyEpisodesGiveAnEmptyList) {
  const auto source = loaded({{"Episodes", PropertyListValue::Array{}}});
  ASSERT_NE(source->episodes(), nullptr);
  EXPECT_TRUE(source->episodes()->empty());
}

TEST(QELReferenceFilePodcastSourceTest, MissingEpisodesLeaveTheListAsItWas) {
  QELReferenceFilePodcastSource source(std::make_shared<const Dictionary>());
  const auto earlier = std::make_shared<QELEpisodeList>();
  source.setEpisodes(earlier);
  platform::ErrorSlot error;
  EXPECT_TRUE(source.loadSourceWithError(error));
  EXPECT_EQ(source.episodes(), earlier);
}

TEST(QELReferenceFilePodcastSourceTest, AllowedTypesAreListsOfTexts) {
  const auto source = loaded(
      {{"AllowedPosterTypes", PropertyListValue::Array{"png", std::int64_t{3}, Dictionary{}}},
       {"AllowedEpisodeTypes", "mp3"}});
  EXPECT_EQ(source->allowedPosterFileTypes(), (QELPodcastSource::FileTypes{"png", "3"}));
  EXPECT_EQ(source->allowedEpisodeFileTypes(), std::nullopt);
}

TEST(QELReferenceFilePodcastSourceTest, LoadingAgainBuildsNewEpisodes) {
  const auto source = loaded({{"Episodes", PropertyListValue::Array{Dictionary{}}}});
  const auto first = source->episodes();
  platform::ErrorSlot error;
  EXPECT_TRUE(source->loadSourceWithError(error));
  EXPECT_NE(source->episodes(), first);
  EXPECT_NE(source->episodes()->at(0), first->at(0));
}

TEST(QELReferenceFilePodcastSourceTest, ReadsAFile) {
  const TemporaryDirectory directory;
  const auto source = QELReferenceFilePodcastSource::initWithPath(directory.addFile(
      "a.plist",
      "<plist version=\"1.0\"><dict><key>PodcastName</key><string>A</string></dict>"
      "</plist>"));
  ASSERT_NE(source, nullptr);
  platform::ErrorSlot error;
  EXPECT_TRUE(source->loadSourceWithError(error));
  EXPECT_EQ(source->title(), "A");
}

TEST(QELReferenceFilePodcastSourceTest, FilesThatAreNoReferenceFileGiveNoSource) {
  const TemporaryDirectory directory;
  for (const char* bytes : {"", "text", "<plist version=\"1.0\"><array/></plist>",
                            "<plist version=\"1.0\"><string>x</string></plist>", "<rss/>",
                            "<plist version=\"1.0\"><dict>"}) {
    EXPECT_EQ(QELReferenceFilePodcastSource::initWithPath(directory.addFile("a.plist", bytes)),
              nullptr)
        << bytes;
  }
  EXPECT_EQ(QELReferenceFilePodcastSource::initWithPath(directory / "missing.plist"), nullptr);
  EXPECT_EQ(QELReferenceFilePodcastSource::initWithPath(directory.path()), nullptr);
}

}  // namespace
