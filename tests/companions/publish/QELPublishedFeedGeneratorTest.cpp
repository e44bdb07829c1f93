#include "companions/publish/QELPublishedFeedGenerator.h"

#include <gtest/gtest.h>

#include <chrono>
#include <regex>
#include <string>

#include "tests/support/EnvironmentGuard.h"

namespace {

using namespace std::chrono_literals;
using platform::PointInTime;

/// From the root element's start on, without the white space between elements.
std::string written(QELPublishedFeedGenerator& generator, QELPodcastSource& source) {
  platform::ErrorSlot error;
  EXPECT_TRUE(generator.generateFromSource(source, error));
  const std::string document = std::regex_replace(*generator.xmlData(), std::regex(">\\s+<"), "><");
  return document.substr(document.find("<rss"));
}

TEST(QELPublishedFeedGeneratorTest, AddsTheRowsOfReaders) {
  const auto first = QELEpisode::episodeWithDictionary(nullptr);
  first->setUuid("u&1");
  first->setLocation("https://a.example/1.mp3");
  first->setDate(PointInTime(1s));
  const auto second = QELEpisode::episodeWithDictionary(nullptr);
  second->setUuid(" ");
  second->setLocation("https://a.example/2.mp3");
  const auto third = QELEpisode::episodeWithDictionary(nullptr);
  QELPodcastSource source;
  source.setLocation("https://a.example/");
  source.setEpisodes(std::make_shared<QELEpisodeList>(QELEpisodeList{first, second, third}));

  const EnvironmentGuard locale("LC_ALL", "de_DE.UTF-8");
  const EnvironmentGuard zone("TZ", "Asia/Tokyo");
  QELPublishedFeedGenerator generator({"acme", "urn:acme"}, PointInTime(86400s));
  generator.setLanguage("pt-BR");
  generator.setSelfURL("https://a.example/feed.xml?a&b");
  EXPECT_EQ(written(generator, source),
            "<rss version=\"2.0\" xmlns:dc=\"http://purl.org/dc/elements/1.1/\" "
            "xmlns:acme=\"urn:acme\" xmlns:qel=\"https://qel.example/ns/1.0\" "
            "xmlns:atom=\"http://www.w3.org/2005/Atom\"><channel>"
            "<pubDate>Fri, 02 Jan 1970 00:00:00 GMT</pubDate><link>https://a.example/</link>"
            "<language>pt-BR</language><atom:link href=\"https://a.example/feed.xml?a&amp;b\" "
            "rel=\"self\" type=\"application/rss+xml\" />"
            "<item><pubDate>Thu, 01 Jan 1970 00:00:01 GMT</pubDate><qel:uuid>u&amp;1</qel:uuid>"
            "<enclosure url=\"https://a.example/1.mp3\" />"
            "<guid isPermaLink=\"false\">u&amp;1</guid></item>"
            "<item><qel:uuid></qel:uuid><enclosure url=\"https://a.example/2.mp3\" />"
            "<guid isPermaLink=\"false\">https://a.example/2.mp3</guid></item>"
            "<item /></channel></rss>\n");
}

TEST(QELPublishedFeedGeneratorTest, WhatIsNotSetIsNotWritten) {
  QELPodcastSource source;
  QELPublishedFeedGenerator generator({}, PointInTime(0s));
  EXPECT_EQ(written(generator, source),
            "<rss version=\"2.0\" xmlns:dc=\"http://purl.org/dc/elements/1.1/\" "
            "xmlns:orvane=\"https://orvane.example/ns/podcast-1.0\" "
            "xmlns:qel=\"https://qel.example/ns/1.0\"><channel>"
            "<pubDate>Thu, 01 Jan 1970 00:00:00 GMT</pubDate></channel></rss>\n");
}

TEST(QELPublishedFeedGeneratorTest, WithoutAStampTheChannelHasTheTimeOfTheRun) {
  const QELPublishedFeedGenerator generator({}, std::nullopt);
  const auto before = std::chrono::system_clock::now() - 1s;
  EXPECT_GE(generator.style().now(), before);
  EXPECT_LE(generator.style().now(), std::chrono::system_clock::now());
}

}  // namespace
