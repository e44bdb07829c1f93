#include "companions/keep/QELKeptShow.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "platform/plist/PropertyListValue.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

using platform::Dictionary;
using platform::PropertyListValue;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr const char* kOrigin = "https://a.example/feed.xml";

Dictionary dictionaryOf(const std::vector<std::pair<std::string, PropertyListValue>>& entries) {
  Dictionary dictionary;
  for (const auto& [key, value] : entries) dictionary.insert_or_assign(key, value);
  return dictionary;
}

class QELKeptShowTest : public testing::Test {
 protected:
  void SetUp() override { ASSERT_TRUE(directory_.open(path_, error_)); }

  /// The entry of an episode whose file is there when it has some content.
  Dictionary entryOf(const std::string& name, const std::string& content = "") const {
    const std::string file = name + ".mp3";
    if (!content.empty()) root_.addFile("show.podcast/" + file, content);
    return dictionaryOf({{"EpisodeName", name},
                         {"EpisodeUUID", name},
                         {"EpisodeReference", file},
                         {"EpisodeReferenceType", "local"}});
  }
  static Dictionary listOf(PropertyListValue::Array episodes) {
    return dictionaryOf({{"PodcastName", "n"}, {"Episodes", std::move(episodes)}});
  }

  std::shared_ptr<QELEpisode> addToSource(const std::string& name,
                                          const platform::OptionalText& location) {
    const auto episode = QELEpisode::episodeWithDictionary(nullptr);
    episode->setTitle(name);
    episode->setUuid(name);
    episode->setLocation(location);
    episode->setReferenceType("remote");
    episodes_->push_back(episode);
    return episode;
  }
  /// The show with what the source says.
  QELKeptShow updated(const Dictionary& kept) {
    QELKeptShow show(kept, directory_, path_);
    source_.setEpisodes(episodes_);
    show.update(source_, kOrigin, std::vector<bool>(episodes_->size(), true), false);
    return show;
  }
  static std::vector<std::string> titlesToFetch(const QELKeptShow& show) {
    std::vector<std::string> titles;
    for (const auto& fetch : show.fetches()) titles.push_back(fetch->title());
    return titles;
  }
  static PropertyListValue::Array episodesOf(const QELKeptShow& show) {
    const Dictionary dictionary = show.dictionary();
    const PropertyListValue* episodes = platform::valueForKey(dictionary, "Episodes");
    return episodes == nullptr ? PropertyListValue::Array() : *episodes->asArray();
  }
  static platform::OptionalText textOf(const PropertyListValue& entry, const std::string& key) {
    return platform::textForKey(*entry.asDictionary(), key);
  }

  TemporaryDirectory root_;
  std::string path_ = root_ / "show.podcast";
  platform::ErrorSlot error_;
  QELBundleDirectory directory_;
  QELPodcastSource source_;
  std::shared_ptr<QELEpisodeList> episodes_ = std::make_shared<QELEpisodeList>();
};

TEST_F(QELKeptShowTest, WhatIsNoListOfEpisodesIsDropped) {
  const Dictionary noList = dictionaryOf({{"PodcastName", "n"}, {"Episodes", "none"}});
  EXPECT_EQ(QELKeptShow(noList, directory_, path_).dictionary(),
            dictionaryOf({{"PodcastName", "n"}}));
  const Dictionary one = entryOf("one", "1");
  EXPECT_EQ(QELKeptShow(listOf({"none", one, std::int64_t{7}}), directory_, path_).dictionary(),
            listOf({one}));
}

TEST_F(QELKeptShowTest, ASourceWithoutEpisodesTakesNoneAway) {
  const Dictionary three = dictionaryOf({{"EpisodeName", "three"}});  // and no file
  QELKeptShow show(listOf({entryOf("one", "1"), entryOf("two"), three}), directory_, path_);
  show.update(source_, kOrigin, {}, false);
  EXPECT_EQ(episodesOf(show).size(), 3U);
  EXPECT_EQ(show.knownCount(), 0U);
  EXPECT_THAT(show.lostTitles(), ElementsAre("\"two\"", "\"three\""));
  EXPECT_THAT(show.fetches(), IsEmpty());
}

TEST_F(QELKeptShowTest, AFileThatIsGoneAndOfWhichTheSourceHasNoneIsLost) {
  addToSource("one", std::nullopt);
  addToSource("two", std::nullopt);
  addToSource("three", std::nullopt);
  const QELKeptShow show = updated(listOf({entryOf("one", "1"), entryOf("two")}));
  EXPECT_EQ(show.knownCount(), 1U);
  EXPECT_EQ(show.emptyCount(), 1U);
  EXPECT_THAT(show.lostTitles(), ElementsAre("\"two\""));
  EXPECT_THAT(show.fetches(), IsEmpty());
  EXPECT_EQ(episodesOf(show).size(), 2U);
}

TEST_F(QELKeptShowTest, AnEntryThatNamesNoFileGetsOne) {
  addToSource("one", "https://a.example/x.mp3");
  const QELKeptShow show = updated(listOf({dictionaryOf({{"EpisodeUUID", "one"}})}));
  EXPECT_THAT(titlesToFetch(show), ElementsAre("\"one\""));
  EXPECT_EQ(show.fetches().front()->name(), "x.mp3");
  EXPECT_THAT(show.lostTitles(), IsEmpty());
}

TEST_F(QELKeptShowTest, APosterThatIsThereIsSharedByItsOrigin) {
  const std::string poster = "https://a.example/p.png";
  root_.addFile("show.podcast/Posters/old.png", "png");
  Dictionary one = entryOf("one", "1");
  one.insert_or_assign("EpisodePosterReference", "Posters/old.png");
  one.insert_or_assign("EpisodePosterOrigin", poster);
  Dictionary two = entryOf("two", "2");
  addToSource("one", "https://a.example/1.mp3")->setPosterLocation(poster);
  addToSource("two", "https://a.example/2.mp3")->setPosterLocation(poster);
  source_.setPosterLocation("");
  for (const auto& episode : *episodes_) episode->setPosterReferenceType("remote");
  const QELKeptShow show = updated(listOf({one, two}));
  EXPECT_THAT(titlesToFetch(show), IsEmpty());
  const PropertyListValue::Array kept = episodesOf(show);
  ASSERT_EQ(kept.size(), 2U);
  EXPECT_EQ(textOf(kept[1], "EpisodePosterReference"), "Posters/old.png");
  EXPECT_EQ(textOf(kept[1], "EpisodePosterReferenceType"), "local");
  EXPECT_EQ(textOf(kept[1], "EpisodePosterOrigin"), poster);
}

TEST_F(QELKeptShowTest, APosterThatIsGoneIsFetchedOnceForAll) {
  const std::string poster = "https://a.example/p.png";
  Dictionary one = entryOf("one", "1");
  one.insert_or_assign("EpisodePosterReference", "Posters/gone.png");
  one.insert_or_assign("EpisodePosterOrigin", poster);
  for (const char* name : {"one", "two"}) {
    const auto episode = addToSource(name, "https://a.example/1.mp3");
    episode->setPosterLocation(poster);
    episode->setPosterReferenceType("remote");
  }
  const QELKeptShow show = updated(listOf({one, entryOf("two", "2")}));
  EXPECT_THAT(titlesToFetch(show), ElementsAre("poster of \"one\""));
}

}  // namespace
