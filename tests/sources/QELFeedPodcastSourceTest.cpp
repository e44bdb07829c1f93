#include "sources/QELFeedPodcastSource.h"

#include <gtest/gtest.h>

#include <string>

#include "model/QELPodcastKeys.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

class QELFeedPodcastSourceTest : public testing::Test {
 protected:
  std::unique_ptr<QELFeedPodcastSource> sourceFor(const std::string& document) const {
    const std::string path = directory_.addFile("feed.xml", document);
    return QELFeedPodcastSource::initWithURL(platform::URL::parse("file://" + path));
  }

  TemporaryDirectory directory_;
};

TEST_F(QELFeedPodcastSourceTest, NoURLGivesNoSource) {
  EXPECT_EQ(QELFeedPodcastSource::initWithURL(std::nullopt), nullptr);
}

TEST_F(QELFeedPodcastSourceTest, LoadWithoutURLFailsWithCodeOne) {
  QELFeedPodcastSource source(std::nullopt);
  platform::ErrorSlot error;
  EXPECT_FALSE(source.loadSourceWithError(error));
  EXPECT_EQ(error, (platform::ErrorRecord{"QELDomain", 1, "No feed URL provided"}));
}

TEST_F(QELFeedPodcastSourceTest, FieldsComeFromTheFeed) {
  const auto source = sourceFor(
      "<rss><channel><title>t</title><orvane:author>a</orvane:author><copyright>c</copyright>"
      "<orvane:keywords>k</orvane:keywords><orvane:category "
      "text=\"g\"/><description>d</description>"
      "<orvane:explicit>clean</orvane:explicit><qel:uuid>u</qel:uuid>"
      "<orvane:image href=\"HTTP://a.example/p.png\"/><link>http://a.example/</link>"
      "<item><title>1</title><enclosure url=\"file:///a.mp3\"/></item><item/></channel></rss>");
  platform::ErrorSlot error;
  ASSERT_TRUE(source->loadSourceWithError(error));
  EXPECT_EQ(source->uuid(), "u");
  EXPECT_EQ(source->title(), "t");
  EXPECT_EQ(source->author(), "a");
  EXPECT_EQ(source->copyright(), "c");
  EXPECT_EQ(source->keywords(), "k");
  EXPECT_EQ(source->category(), "g");
  EXPECT_EQ(source->podcastDescription(), "d");
  EXPECT_EQ(source->advisoryLabel(), "Clean");
  EXPECT_EQ(source->posterLocation(), "HTTP://a.example/p.png");
  EXPECT_EQ(source->posterReferenceType(), "remote");
  EXPECT_EQ(source->location(), std::nullopt);
  EXPECT_EQ(source->referenceType(), std::nullopt);
  EXPECT_EQ(source->allowedEpisodeFileTypes(), std::nullopt);
  ASSERT_EQ(source->episodes()->size(), 2U);
  EXPECT_EQ(source->episodes()->at(0)->title(), "1");
  EXPECT_EQ(source->episodes()->at(0)->referenceType(), "remote");
  EXPECT_EQ(source->episodes()->at(1)->orvaneOrder(), -1);
}

TEST_F(QELFeedPodcastSourceTest, WhatTheFeedLacksBecomesAbsent) {
  const auto source = sourceFor("<rss><channel/></rss>");
  for (const QELPodcastKey& field : QELPodcastKeys()) (*source.*field.setValue)("earlier");
  platform::ErrorSlot error;
  ASSERT_TRUE(source->loadSourceWithError(error));
  for (const QELPodcastKey& field : QELPodcastKeys()) {
    EXPECT_EQ((*source.*field.value)(), std::nullopt) << field.key;
  }
  ASSERT_NE(source->episodes(), nullptr);
  EXPECT_TRUE(source->episodes()->empty());
}

TEST_F(QELFeedPodcastSourceTest, FailureLeavesTheFieldsAsTheyWere) {
  for (const char* document : {"<feed/>", "<rss><channel><title>new</title>"}) {
    const auto source = sourceFor(document);
    source->setTitle("earlier");
    platform::ErrorSlot error;
    EXPECT_FALSE(source->loadSourceWithError(error));
    EXPECT_TRUE(error);
    EXPECT_EQ(source->title(), "earlier");
    EXPECT_EQ(source->episodes(), nullptr);
  }
}

TEST_F(QELFeedPodcastSourceTest, AtomIsRefusedWithCodeThree) {
  platform::ErrorSlot error;
  EXPECT_FALSE(
      sourceFor("<feed xmlns=\"http://www.w3.org/2005/Atom\"/>")->loadSourceWithError(error));
  EXPECT_EQ(error, (platform::ErrorRecord{"QELDomain", 3, "The feed was neither RSS nor Atom"}));
}

TEST_F(QELFeedPodcastSourceTest, EmptyFilesAreRefusedWithCodeThree) {
  platform::ErrorSlot error;
  EXPECT_FALSE(sourceFor("")->loadSourceWithError(error));
  EXPECT_EQ(error, (platform::ErrorRecord{"QELDomain", 3,
                                          "Could not load or read the specified feed URL"}));
}

TEST_F(QELFeedPodcastSourceTest, FailedReadPassesItsRecordOn) {
  const auto source =
      QELFeedPodcastSource::initWithURL(platform::URL::parse("file:///nowhere/f.xml"));
  platform::ErrorSlot error;
  EXPECT_FALSE(source->loadSourceWithError(error));
  ASSERT_TRUE(error);
  EXPECT_EQ(error->domain, "POSIX");
  EXPECT_NE(error->description.find("No such file or directory"), std::string::npos);
}

}  // namespace
