#include "model/QELPodcastKeys.h"

#include <gtest/gtest.h>

namespace {

using platform::Dictionary;

TEST(QELPodcastKeysTest, KeysAreInTheOrderOfReadingAndWriting) {
  std::vector<std::string_view> keys;
  for (const QELPodcastKey& field : QELPodcastKeys()) keys.push_back(field.key);
  EXPECT_EQ(keys, (std::vector<std::string_view>{
                      "PodcastUUID", "PodcastName", "PodcastAuthor", "PodcastCopyright",
                      "PodcastKeywords", "PodcastCategory", "PodcastDescription",
                      "PodcastAdvisoryLabel", "PodcastReference", "PodcastReferenceType",
                      "PodcastPosterReference", "PodcastPosterReferenceType"}));
}

TEST(QELPodcastKeysTest, DescriptiveKeysEndBeforeTheLocation) {
  EXPECT_EQ(QELPodcastDescriptiveKeys().size(), 8U);
  EXPECT_EQ(QELPodcastDescriptiveKeys().back().key, "PodcastAdvisoryLabel");
}

TEST(QELPodcastKeysTest, OnlyPresentFieldsAreAdded) {
  QELPodcastSource source;
  source.setTitle("A show");
  source.setCategory("");
  source.setLocation("/shows/a");
  Dictionary all;
  QELAddPodcastKeys(QELPodcastKeys(), source, all);
  EXPECT_EQ(all, (Dictionary{{"PodcastName", "A show"},
                             {"PodcastCategory", ""},
                             {"PodcastReference", "/shows/a"}}));

  Dictionary descriptive;
  QELAddPodcastKeys(QELPodcastDescriptiveKeys(), source, descriptive);
  EXPECT_EQ(descriptive, (Dictionary{{"PodcastName", "A show"}, {"PodcastCategory", ""}}));
}

}  // namespace
