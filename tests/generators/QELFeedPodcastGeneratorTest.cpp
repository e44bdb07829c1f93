#include "generators/QELFeedPodcastGenerator.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <cstdlib>
#include <iostream>
#include <regex>
#include <string>

#include "tests/support/EnvironmentGuard.h"

namespace {

using namespace std::chrono_literals;
using platform::PointInTime;

constexpr const char* kDeclaration = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>";

/// The document without the white space between its elements, which is the serialiser's own.
std::string compact(const std::string& document) {
  return std::regex_replace(document, std::regex(">\\s+<"), "><");
}

std::string generated(QELPodcastSource& source, const char* format = "rss", bool stamped = false) {
  QELFeedPodcastGenerator generator;
  generator.setFormat(format);
  generator.setGeneratePubDate(stamped);
  platform::ErrorSlot error;
  EXPECT_TRUE(generator.generateFromSource(source, error));
  EXPECT_EQ(error, std::nullopt);
  return compact(*generator.xmlData());
}

std::string channelOf(QELPodcastSource& source) {
  const std::string document = generated(source);
  const std::string head = std::string(kDeclaration) +
                           "<rss version=\"2.0\" xmlns:dc=\"http://purl.org/dc/elements/1.1/\" "
                           "xmlns:orvane=\"https://orvane.example/ns/podcast-1.0\" "
                           "xmlns:qel=\"https://qel.example/ns/1.0\">";
  EXPECT_EQ(document.substr(0, head.size()), head);
  const std::string rest = document.substr(head.size());
  const std::size_t end = rest.rfind("</rss>");
  EXPECT_NE(end, std::string::npos) << document;
  return rest.substr(0, end);
}

std::string itemOf(const std::shared_ptr<QELEpisode>& episode) {
  QELPodcastSource source;
  source.setEpisodes(std::make_shared<QELEpisodeList>(QELEpisodeList{episode}));
  return channelOf(source);
}

std::string item(const std::string& content) {
  return content.empty() ? "<channel><item /></channel>"
                         : "<channel><item>" + content + "</item></channel>";
}

std::string channel(const std::string& content) {
  return content.empty() ? "<channel />" : "<channel>" + content + "</channel>";
}

std::shared_ptr<QELEpisode> unorderedEpisode() {
  return QELEpisode::episodeWithDictionary(nullptr);
}

TEST(QELFeedPodcastGeneratorTest, StartsAsRssWithAStamp) {
  const QELFeedPodcastGenerator generator;
  EXPECT_EQ(generator.format(), "rss");
  EXPECT_TRUE(generator.generatePubDate());
  EXPECT_EQ(generator.xmlData(), nullptr);
}

TEST(QELFeedPodcastGeneratorTest, EmptyPodcastGivesAnEmptyChannel) {
  QELPodcastSource source;
  EXPECT_EQ(channelOf(source), channel(""));
}

TEST(QELFeedPodcastGeneratorTest, ChannelIsStampedWithTheTimeOfGeneration) {
  QELPodcastSource source;
  const std::string document = generated(source, "rss", true);
  EXPECT_TRUE(std::regex_search(
      document, std::regex("<channel><pubDate>[A-Z][a-z]{2}, \\d\\d [A-Z][a-z]{2} \\d{4} "
                           "\\d\\d:\\d\\d:\\d\\d GMT[^<]*</pubDate></channel>")))
      << document;
}

TEST(QELFeedPodcastGeneratorTest, ChannelHoldsEveryFieldInOrder) {
  QELPodcastSource source;
  source.setUuid("u");
  source.setTitle("t");
  source.setAuthor("a");
  source.setCopyright("c");
  source.setKeywords("k");
  source.setCategory("g & h");
  source.setPodcastDescription("d < e");
  source.setAdvisoryLabel("Clean");
  source.setLocation("/shows/a b");
  source.setReferenceType("local");
  source.setPosterLocation("http://a.example/p.png");
  source.setPosterReferenceType("remote");
  EXPECT_EQ(channelOf(source),
            channel("<title>t</title><dc:creator>a</dc:creator><orvane:author>a</orvane:author>"
                    "<copyright>c</copyright><orvane:keywords>k</orvane:keywords>"
                    "<orvane:category text=\"g &amp; h\" /><description>d &lt; e</description>"
                    "<orvane:summary>d &lt; e</orvane:summary>"
                    "<orvane:explicit>clean</orvane:explicit><qel:uuid>u</qel:uuid>"
                    "<image><url>http://a.example/p.png</url><title>t</title></image>"
                    "<orvane:image href=\"http://a.example/p.png\" /><link>/shows/a b</link>"));
}

TEST(QELFeedPodcastGeneratorTest, ItemHoldsEveryFieldInOrder) {
  const auto episode = unorderedEpisode();
  episode->setUuid("u");
  episode->setTitle("t");
  episode->setAuthor("a");
  episode->setDate(PointInTime(1181079000s));
  episode->setKeywords("k");
  episode->setCategory("g");
  episode->setEpisodeDescription("d");
  episode->setAdvisoryLabel("Explicit");
  episode->setOrvaneOrder(3);
  episode->setLocation("http://a.example/1.mp3");
  episode->setReferenceType("remote");
  episode->setContentType("audio/mpeg");
  episode->setContentLength(18446744073709551615U);
  episode->setPosterLocation("p.png");
  episode->setPosterReferenceType("local");
  std::string document = itemOf(episode);
  const std::regex date("<pubDate>([^<]*)</pubDate>");
  std::smatch match;
  ASSERT_TRUE(std::regex_search(document, match, date));
  EXPECT_NE(match.str(1).find("Jun 2007"), std::string::npos);
  EXPECT_EQ(std::regex_replace(document, date, "<pubDate>D</pubDate>"),
            item("<title>t</title><dc:creator>a</dc:creator><orvane:author>a</orvane:author>"
                 "<pubDate>D</pubDate><orvane:keywords>k</orvane:keywords>"
                 "<orvane:category text=\"g\" /><description>d</description>"
                 "<orvane:summary>d</orvane:summary><orvane:explicit>yes</orvane:explicit>"
                 "<qel:uuid>u</qel:uuid><qel:order>3</qel:order><orvane:image href=\"p.png\" />"
                 "<enclosure url=\"http://a.example/1.mp3\" type=\"audio/mpeg\" "
                 "length=\"18446744073709551615\" />"));
}

TEST(QELFeedPodcastGeneratorTest, DatesAreWrittenInTheProcessesLocaleAndZone) {
  // The first date decides for the process, so this takes a new one.
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  const auto writeItem = [] {
    const EnvironmentGuard zone("TZ", "America/Los_Angeles");
    const EnvironmentGuard locale("LC_ALL", "de_DE");
    const auto episode = unorderedEpisode();
    episode->setDate(PointInTime(1181079000s));
    std::cerr << itemOf(episode);
    std::exit(0);
  };
  EXPECT_EXIT(writeItem(), testing::ExitedWithCode(0),
              testing::HasSubstr(item("<pubDate>Di., 05 Juni 2007 14:30:00 GMT-07:00</pubDate>")));
}

TEST(QELFeedPodcastGeneratorTest, StampedEpisodeHasTheCurrentTimeAsItsDate) {
  const std::shared_ptr<QELEpisode> episode = unorderedEpisode();
  episode->setDate(PointInTime(0ms));
  std::string bytes;
  platform::XMLWriter document(bytes, {});
  QELPopulateRSSElementFromItem(document.appendRoot("item"), *episode, true, QELFeedStyle());
  document.finish();
  EXPECT_TRUE(std::regex_search(bytes, std::regex("<pubDate>[^<]* 20\\d\\d [^<]*</pubDate>")))
      << bytes;
  EXPECT_EQ(bytes.find("1970"), std::string::npos);
}

TEST(QELFeedPodcastGeneratorTest, ItemsFollowTheChannelsOwnChildren) {
  QELPodcastSource source;
  source.setLocation("l");
  source.setEpisodes(std::make_shared<QELEpisodeList>(
      QELEpisodeList{unorderedEpisode(), QELEpisode::episode(), unorderedEpisode()}));
  EXPECT_EQ(channelOf(source), channel("<link>l</link><item /><item><qel:order>0</qel:order></item>"
                                       "<item />"));
}

TEST(QELFeedPodcastGeneratorTest, AdvisoryLabels) {
  struct Row {
    const char* label;
    const char* element;
  };
  const Row rows[] = {
      {"Explicit", "<orvane:explicit>yes</orvane:explicit>"},
      {"EXPLICIT", "<orvane:explicit>yes</orvane:explicit>"},
      {"yEs", "<orvane:explicit>yes</orvane:explicit>"},
      {"Clean", "<orvane:explicit>clean</orvane:explicit>"},
      {"no", ""},
      {"", ""},
      {" clean", ""},
  };
  for (const Row& row : rows) {
    QELPodcastSource source;
    source.setAdvisoryLabel(row.label);
    EXPECT_EQ(channelOf(source), channel(row.element)) << row.label;
  }
}

TEST(QELFeedPodcastGeneratorTest, NegativeOrderIsNotWritten) {
  const auto episode = unorderedEpisode();
  EXPECT_EQ(itemOf(episode), item(""));
  episode->setOrvaneOrder(INT64_MIN);
  EXPECT_EQ(itemOf(episode), item(""));
  episode->setOrvaneOrder(INT64_MAX);
  EXPECT_EQ(itemOf(episode), item("<qel:order>9223372036854775807</qel:order>"));
}

struct URLRow {
  std::optional<platform::Text> type;
  const char* location;
  std::optional<std::string> url;
};

const URLRow kURLRows[] = {
    {"remote", "http://a.example/a b?c&d", "http://a.example/a b?c&amp;d"},
    {"remote", "/media/a.mp3", "/media/a.mp3"},
    {"local", "/media/a b%.mp3", "file:///media/a%20b%25.mp3"},
    {"local", "a b.mp3", "a b.mp3"},
    {"local", "http://a.example/", "http://a.example/"},
    {std::nullopt, "/media/a.mp3", "/media/a.mp3"},
    {std::nullopt, "", ""},
    {"Remote", "http://a.example/", std::nullopt},
    {"", "http://a.example/", std::nullopt},
};

TEST(QELFeedPodcastGeneratorTest, MediaURLs) {
  for (const URLRow& row : kURLRows) {
    const auto episode = unorderedEpisode();
    episode->setLocation(row.location);
    episode->setReferenceType(row.type);
    EXPECT_EQ(itemOf(episode), item(row.url ? "<enclosure url=\"" + *row.url + "\" />" : ""))
        << row.location;
  }
}

TEST(QELFeedPodcastGeneratorTest, EpisodePosterURLs) {
  for (const URLRow& row : kURLRows) {
    const auto episode = unorderedEpisode();
    episode->setPosterLocation(row.location);
    episode->setPosterReferenceType(row.type);
    EXPECT_EQ(itemOf(episode), item(row.url ? "<orvane:image href=\"" + *row.url + "\" />" : ""))
        << row.location;
  }
}

TEST(QELFeedPodcastGeneratorTest, PodcastPosterURLs) {
  for (const URLRow& row : kURLRows) {
    QELPodcastSource source;
    source.setPosterLocation(row.location);
    source.setPosterReferenceType(row.type);
    EXPECT_EQ(channelOf(source),
              channel(row.url ? "<image><url>" + *row.url + "</url></image><orvane:image href=\"" +
                                    *row.url + "\" />"
                              : ""))
        << row.location;
  }
}

TEST(QELFeedPodcastGeneratorTest, LinkIsNeverConverted) {
  for (const char* type : {"local", "remote", "other"}) {
    QELPodcastSource source;
    source.setLocation("/shows/a");
    source.setReferenceType(type);
    EXPECT_EQ(channelOf(source), channel("<link>/shows/a</link>")) << type;
  }
}

TEST(QELFeedPodcastGeneratorTest, EmptyTextsAreWritten) {
  QELPodcastSource source;
  source.setTitle("");
  source.setCategory("");
  EXPECT_EQ(channelOf(source), channel("<title></title><orvane:category text=\"\" />"));
}

TEST(QELFeedPodcastGeneratorTest, RoomForMuchIsNotMadeAsIfAllOfItWereEscaped) {
  constexpr std::size_t kEpisodes = 50;
  constexpr std::size_t kSize = std::size_t{1} << 20;
  const auto episode = unorderedEpisode();
  episode->setEpisodeDescription(std::string(kSize, '\1'));  // none of which is written
  QELPodcastSource source;
  source.setEpisodes(std::make_shared<QELEpisodeList>(kEpisodes, episode));
  QELFeedPodcastGenerator generator;
  platform::ErrorSlot error;
  ASSERT_TRUE(generator.generateFromSource(source, error));
  EXPECT_GE(generator.xmlData()->capacity(), 2 * kEpisodes * kSize);
  EXPECT_LE(generator.xmlData()->capacity(), 2 * kEpisodes * kSize + 16'384);
}

TEST(QELFeedPodcastGeneratorTest, AtomIsAnEmptyDocument) {
  QELPodcastSource source;
  source.setTitle("t");
  const std::string document = generated(source, "atom");
  EXPECT_EQ(document.substr(0, document.find_last_not_of('\n') + 1), kDeclaration);
}

TEST(QELFeedPodcastGeneratorTest, NothingFillsAnElementForAtom) {
  std::string document;
  platform::XMLWriter writer(document,
                             {.indentation = ' ', .indentationWidth = 2, .emptyTagEnd = " />"});
  const platform::XMLElement feed = writer.appendRoot("feed");
  QELPodcastSource source;
  source.setTitle("t");
  QELPopulateAtomElementFromItem(feed, source);
  const auto episode = unorderedEpisode();
  episode->setTitle("t");
  QELPopulateAtomElementFromItem(feed, *episode);
  writer.finish();
  EXPECT_EQ(compact(document), std::string(kDeclaration) + "<feed />\n");
}

TEST(QELFeedPodcastGeneratorTest, UnknownFormatFailsAndKeepsTheEarlierDocument) {
  for (const char* format : {"RSS", "Atom", "", "rss "}) {
    QELFeedPodcastGenerator generator;
    const auto earlier = std::make_shared<const std::string>("earlier");
    generator.setXmlData(earlier);
    generator.setFormat(format);
    QELPodcastSource source;
    platform::ErrorSlot error;
    EXPECT_FALSE(generator.generateFromSource(source, error));
    EXPECT_EQ(error, (platform::ErrorRecord{
                         "QELDomain", 2,
                         std::string("\"") + format + "\" is not a recognized feed format"}));
    EXPECT_EQ(generator.xmlData(), earlier);
  }
}

TEST(QELFeedPodcastGeneratorTest, StyleGivesTheDirectoryAndTheDates) {
  QELPodcastSource source;
  source.setAuthor("a");
  source.setKeywords("k");
  source.setCategory("c");
  source.setPodcastDescription("d");
  source.setAdvisoryLabel("Clean");
  source.setPosterLocation("p");
  const auto episode = unorderedEpisode();
  episode->setDate(PointInTime(7s));
  source.setEpisodes(std::make_shared<QELEpisodeList>(QELEpisodeList{episode}));

  QELFeedPodcastGenerator generator;
  QELFeedStyle style({"acme", "urn:a&b"});
  style.dateText = [](PointInTime date) {
    return std::to_string(
        std::chrono::floor<std::chrono::seconds>(date).time_since_epoch().count());
  };
  style.now = [] { return PointInTime(5s); };
  generator.setStyle(style);
  platform::ErrorSlot error;
  ASSERT_TRUE(generator.generateFromSource(source, error));
  EXPECT_EQ(compact(*generator.xmlData()),
            std::string(kDeclaration) +
                "<rss version=\"2.0\" xmlns:dc=\"http://purl.org/dc/elements/1.1/\" "
                "xmlns:acme=\"urn:a&amp;b\" xmlns:qel=\"https://qel.example/ns/1.0\"><channel>"
                "<dc:creator>a</dc:creator><acme:author>a</acme:author><pubDate>5</pubDate>"
                "<acme:keywords>k</acme:keywords><acme:category text=\"c\" />"
                "<description>d</description><acme:summary>d</acme:summary>"
                "<acme:explicit>clean</acme:explicit>"
                "<image><url>p</url></image><acme:image href=\"p\" />"
                "<item><pubDate>7</pubDate></item></channel></rss>\n");
}

TEST(QELFeedPodcastGeneratorTest, DerivedGeneratorsAddRows) {
  class Adding : public QELFeedPodcastGenerator {
   protected:
    void appendNamespaces(platform::XMLElement rss) const override {
      rss.appendAttribute("xmlns:more", "urn:more");
    }
    void appendToChannel(platform::XMLElement channel,
                         const QELPodcastSource& source) const override {
      channel.appendChild("more:title", *source.title());
    }
    void appendToItem(platform::XMLElement item, const QELEpisode& episode) const override {
      item.appendChild("more:guid", *episode.uuid());
    }
  };
  QELPodcastSource source;
  source.setTitle("t");
  source.setLocation("l");
  const auto episode = unorderedEpisode();
  episode->setUuid("u");
  episode->setLocation("m");
  source.setEpisodes(std::make_shared<QELEpisodeList>(QELEpisodeList{episode, episode}));
  Adding generator;
  generator.setGeneratePubDate(false);
  platform::ErrorSlot error;
  ASSERT_TRUE(generator.generateFromSource(source, error));
  const std::string row =
      "<item><qel:uuid>u</qel:uuid><enclosure url=\"m\" /><more:guid>u</more:guid></item>";
  const std::string document = compact(*generator.xmlData());
  EXPECT_NE(document.find("xmlns:qel=\"https://qel.example/ns/1.0\" xmlns:more=\"urn:more\">"),
            std::string::npos);
  EXPECT_EQ(document.substr(document.find("<channel>")),
            "<channel><title>t</title><link>l</link><more:title>t</more:title>" + row + row +
                "</channel></rss>\n");
}

}  // namespace
