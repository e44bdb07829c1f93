#include "generators/QELReferenceFilePodcastGenerator.h"

#include <gtest/gtest.h>

#include "model/QELPodcastKeys.h"

namespace {

using platform::Dictionary;
using platform::PropertyListValue;

Dictionary generated(QELPodcastSource& source) {
  QELReferenceFilePodcastGenerator generator;
  EXPECT_EQ(generator.referenceData(), nullptr);
  platform::ErrorSlot error;
  EXPECT_TRUE(generator.generateFromSource(source, error));
  EXPECT_EQ(error, std::nullopt);
  return *generator.referenceData();
}

std::shared_ptr<QELEpisode> episodeEntitled(const char* title) {
  const Dictionary dictionary{{"EpisodeName", title}};
  return QELEpisode::episodeWithDictionary(&dictionary);
}

TEST(QELReferenceFilePodcastGeneratorTest, EmptySourceGivesAnEmptyDictionary) {
  QELPodcastSource source;
  EXPECT_EQ(generated(source), Dictionary());
}

TEST(QELReferenceFilePodcastGeneratorTest, EveryFieldIsWrittenAsItStands) {
  QELPodcastSource source;
  Dictionary expected;
  for (const QELPodcastKey& field : QELPodcastKeys()) {
    const std::string value = " value of " + std::string(field.key) + "\n";
    (source.*field.setValue)(platform::Text(value));
    expected.emplace(std::string(field.key), value);
  }
  EXPECT_EQ(generated(source), expected);
}

TEST(QELReferenceFilePodcastGeneratorTest, EmptyEpisodeListIsNotWritten) {
  QELPodcastSource source;
  source.setEpisodes(std::make_shared<QELEpisodeList>());
  EXPECT_EQ(generated(source), Dictionary());
}

TEST(QELReferenceFilePodcastGeneratorTest, EpisodesAreWrittenWithoutATitleOfThePodcast) {
  QELPodcastSource source;
  source.setEpisodes(std::make_shared<QELEpisodeList>(QELEpisodeList{
      episodeEntitled("b"), episodeEntitled("a"), QELEpisode::episodeWithDictionary(nullptr)}));
  EXPECT_EQ(generated(source),
            (Dictionary{{"Episodes", PropertyListValue::Array{Dictionary{{"EpisodeName", "b"}},
                                                              Dictionary{{"EpisodeName", "a"}},
                                                              Dictionary{}}}}));
}

TEST(QELReferenceFilePodcastGeneratorTest, PosterWithoutTypeIsWrittenWithoutType) {
  QELPodcastSource source;
  source.setPosterLocation("p.png");
  EXPECT_EQ(generated(source), (Dictionary{{"PodcastPosterReference", "p.png"}}));
}

TEST(QELReferenceFilePodcastGeneratorTest, AllowedTypesAreNotCarriedOver) {
  QELPodcastSource source;
  source.setAllowedPosterFileTypes(QELPodcastSource::FileTypes{"png"});
  source.setAllowedEpisodeFileTypes(QELPodcastSource::FileTypes{"mp3"});
  EXPECT_EQ(generated(source), Dictionary());
}

TEST(QELReferenceFilePodcastGeneratorTest, GeneratingAgainMakesAFreshDictionary) {
  QELReferenceFilePodcastGenerator generator;
  QELPodcastSource source;
  platform::ErrorSlot error;
  source.setTitle("one");
  generator.generateFromSource(source, error);
  const auto first = generator.referenceData();
  source.setTitle(std::nullopt);
  generator.generateFromSource(source, error);
  EXPECT_EQ(*first, (Dictionary{{"PodcastName", "one"}}));
  EXPECT_EQ(*generator.referenceData(), Dictionary());
}

}  // namespace
