#include "sources/FeedParser.h"

#include <gtest/gtest.h>

#include <chrono>
#include <string>

namespace {

using namespace std::chrono_literals;
using platform::Dictionary;
using platform::PointInTime;

struct Feed {
  Dictionary attributes;
  std::vector<Dictionary> episodes;
};

/// What a feed that must parse holds.
Feed parse(const std::string& document) {
  const auto parser = FeedParser::parserWithFeedData(document);
  platform::ErrorSlot error;
  EXPECT_TRUE(parser->parseWithError(error)) << error.value_or(platform::ErrorRecord()).description;
  EXPECT_EQ(parser->feedType(), "rss");
  return {parser->feedAttributes(), parser->episodes()};
}

Feed parseChannel(const std::string& channel) {
  return parse(
      "<rss version=\"2.0\" xmlns:orvane=\"https://orvane.example/ns/podcast-1.0\" "
      "xmlns:dc=\"http://purl.org/dc/elements/1.1/\" xmlns:qel=\"https://qel.example/ns/1.0\">"
      "<channel>" +
      channel + "</channel></rss>");
}

Dictionary channelWith(const std::string& content) {
  return parseChannel(content).attributes;
}

Dictionary itemWith(const std::string& content) {
  const Feed feed = parseChannel("<item>" + content + "</item>");
  EXPECT_EQ(feed.attributes, Dictionary());
  EXPECT_EQ(feed.episodes.size(), 1U);
  return feed.episodes.at(0);
}

constexpr const char* kUuid = "01234567-89ab-cdef-0123-456789abcdef";
constexpr const char* kOtherUuid = "fedcba98-7654-3210-fedc-ba9876543210";

TEST(FeedParserTest, AbsentDataGivesNoParser) {
  EXPECT_EQ(FeedParser::parserWithFeedData(std::nullopt), nullptr);
}

TEST(FeedParserTest, FreshParserIsEmpty) {
  const auto parser = FeedParser::parserWithFeedData("<rss/>");
  EXPECT_EQ(parser->feedType(), std::nullopt);
  EXPECT_EQ(parser->feedAttributes(), Dictionary());
  EXPECT_TRUE(parser->episodes().empty());
}

TEST(FeedParserTest, ItemBecomesAFeedItemDictionary) {
  EXPECT_EQ(itemWith("<title>One</title>"
                     "<enclosure url=\"a.mp3\" length=\"1234\" type=\"audio/mpeg\"/>"
                     "<pubDate>Tue, 05 Jun 2007 21:30:00 GMT</pubDate>"
                     "<orvane:explicit>Yes</orvane:explicit>"),
            (Dictionary{{"title", "One"},
                        {"url", "a.mp3"},
                        {"contentLength", std::int64_t{1234}},
                        {"contentType", "audio/mpeg"},
                        {"date", PointInTime(1181079000s)},
                        {"advisoryLabel", "Explicit"}}));
}

TEST(FeedParserTest, TextElementsGoToTheirKeys) {
  struct Row {
    const char* element;
    const char* key;
  };
  const Row rows[] = {
      {"title", "title"},          {"author", "author"},     {"dc:creator", "author"},
      {"orvane:author", "author"}, {"creator", "author"},    {"description", "description"},
      {"copyright", "copyright"},  {"keywords", "keywords"}, {"orvane:keywords", "keywords"},
      {"other:title", "title"},
  };
  for (const Row& row : rows) {
    const std::string element = row.element;
    const std::string content = "<" + element + "> a\n&amp; b\t</" + element + ">";
    const Dictionary expected{{row.key, " a\n& b\t"}};
    EXPECT_EQ(channelWith(content), expected) << element;
    EXPECT_EQ(itemWith(content), expected) << element;
  }
}

TEST(FeedParserTest, CharacterDataSectionsAreOrdinaryText) {
  EXPECT_EQ(itemWith("<title>a <![CDATA[<b> & ]]>c</title>"), (Dictionary{{"title", "a <b> & c"}}));
}

TEST(FeedParserTest, EmptyTextIsPresent) {
  EXPECT_EQ(itemWith("<title/>"), (Dictionary{{"title", ""}}));
}

TEST(FeedParserTest, LaterTextReplacesAnEarlierOne) {
  EXPECT_EQ(itemWith("<title>a</title><title>b</title>"), (Dictionary{{"title", "b"}}));
}

TEST(FeedParserTest, TextOfNestedElementsIsCollectedToo) {
  EXPECT_EQ(itemWith("<description>a<b>c</b>d</description>"),
            (Dictionary{{"description", "acd"}}));
}

TEST(FeedParserTest, NestedTextElementTakesTheTextBeforeIt) {
  EXPECT_EQ(itemWith("<description>lost<title>t</title>kept</description>"),
            (Dictionary{{"title", "t"}, {"description", "kept"}}));
}

TEST(FeedParserTest, SummaryAndEncodedContentAreNotKept) {
  EXPECT_EQ(itemWith("<orvane:summary>s</orvane:summary><content:encoded "
                     "xmlns:content=\"c\">x</content:encoded><guid>g</guid>"),
            Dictionary());
}

TEST(FeedParserTest, EnclosureLengths) {
  struct Row {
    const char* length;
    std::optional<std::int64_t> number;
  };
  const Row rows[] = {
      {"1234", 1234},       {" 42", 42},
      {"\t+42x", 42},       {"0", std::nullopt},
      {"-3", std::nullopt}, {"abc", std::nullopt},
      {"", std::nullopt},   {"99999999999999999999999", INT64_MAX},
  };
  for (const Row& row : rows) {
    Dictionary expected;
    if (row.number) expected.emplace("contentLength", *row.number);
    EXPECT_EQ(itemWith(std::string("<enclosure length=\"") + row.length + "\"/>"), expected)
        << row.length;
  }
}

TEST(FeedParserTest, EnclosureOutsideAnItemIsLost) {
  EXPECT_EQ(channelWith("<enclosure url=\"a.mp3\" length=\"1\" type=\"t\"/>"), Dictionary());
}

TEST(FeedParserTest, AdvisoryLabels) {
  struct Row {
    const char* text;
    std::optional<const char*> label;
  };
  const Row rows[] = {
      {"yes", "Explicit"},    {"YES", "Explicit"},     {"Clean", "Clean"}, {"no", std::nullopt},
      {"true", std::nullopt}, {" yes ", std::nullopt}, {"", std::nullopt},
  };
  for (const Row& row : rows) {
    Dictionary expected;
    if (row.label) expected.emplace("advisoryLabel", *row.label);
    const std::string content = std::string("<orvane:explicit>") + row.text + "</orvane:explicit>";
    EXPECT_EQ(itemWith(content), expected) << row.text;
    EXPECT_EQ(channelWith(content), expected) << row.text;
  }
}

TEST(FeedParserTest, UnknownAdvisoryLabelKeepsTheEarlierOne) {
  EXPECT_EQ(itemWith("<orvane:explicit>yes</orvane:explicit><orvane:explicit>no</orvane:explicit>"),
            (Dictionary{{"advisoryLabel", "Explicit"}}));
}

TEST(FeedParserTest, RejectedDateLeavesTheKeyOut) {
  EXPECT_EQ(itemWith("<pubDate>yesterday</pubDate>"), Dictionary());
  EXPECT_EQ(channelWith("<pubDate>05 Jun 2007 21:30 GMT</pubDate>"),
            (Dictionary{{"date", PointInTime(1181079000s)}}));
}

TEST(FeedParserTest, FirstCategoryWins) {
  EXPECT_EQ(itemWith("<orvane:category text=\"Arts\"><orvane:category text=\"Food\"/>"
                     "</orvane:category><orvane:category text=\"Comedy\"/>"),
            (Dictionary{{"category", "Arts"}}));
}

TEST(FeedParserTest, CategoryWithoutTextDoesNotCount) {
  EXPECT_EQ(channelWith("<orvane:category/><orvane:category text=\"Comedy\"/>"),
            (Dictionary{{"category", "Comedy"}}));
}

TEST(FeedParserTest, PrefixesAreMatchedAsWritten) {
  EXPECT_EQ(channelWith("<category text=\"a\">b</category><x:category xmlns:x=\"y\" text=\"a\"/>"
                        "<x:image xmlns:x=\"y\" href=\"a.png\"/><uuid>u</uuid><order>1</order>"),
            Dictionary());
}

TEST(FeedParserTest, UndeclaredPrefixIsNoError) {
  EXPECT_EQ(parse("<rss><channel><orvane:image href=\"a.png\"/></channel></rss>").attributes,
            (Dictionary{{"poster", "a.png"}}));
}

TEST(FeedParserTest, PosterOfTheDirectoryImageAlwaysWins) {
  const Dictionary expected{{"poster", "o.png"}};
  const std::string image = "<image><url>i.png</url></image>";
  const std::string orvane = "<orvane:image href=\"o.png\"/>";
  EXPECT_EQ(channelWith(image + orvane), expected);
  EXPECT_EQ(channelWith(orvane + image), expected);
  EXPECT_EQ(itemWith("<orvane:image href=\"first.png\"/>" + orvane), expected);
}

TEST(FeedParserTest, PosterOfTheImageFillsOnlyAnEmptyOne) {
  EXPECT_EQ(channelWith("<image><url>a.png</url></image><image><url>b.png</url></image>"),
            (Dictionary{{"poster", "a.png"}}));
}

TEST(FeedParserTest, DirectoryImageWithoutAddressLeavesThePoster) {
  EXPECT_EQ(channelWith("<image><url>a.png</url></image><orvane:image/>"),
            (Dictionary{{"poster", "a.png"}}));
}

TEST(FeedParserTest, AddressOutsideAnImageIsLost) {
  EXPECT_EQ(channelWith("<url>a.png</url>"), Dictionary());
}

TEST(FeedParserTest, ImageTitleReplacesTheFeedsTitle) {
  EXPECT_EQ(channelWith("<title>Show</title><image><title>Logo</title><description>d"
                        "</description></image>"),
            (Dictionary{{"title", "Logo"}, {"description", "d"}}));
}

TEST(FeedParserTest, LinksCarryUuids) {
  const std::string collection = std::string("http://a.example/collection/uuid/") + kUuid;
  const std::string document = std::string("http://a.example/document/uuid/") + kOtherUuid;
  const auto link = [](const std::string& text) { return "<link>" + text + "</link>"; };

  const Dictionary feedUuid{{"QELUUID", kUuid}};
  const Dictionary itemUuid{{"QELUUID", kOtherUuid}};
  EXPECT_EQ(channelWith(link(collection)), feedUuid);
  EXPECT_EQ(channelWith(link(collection + "/more")), feedUuid);
  EXPECT_EQ(channelWith(link(document)), Dictionary());
  EXPECT_EQ(itemWith(link(document)), itemUuid);
  EXPECT_EQ(channelWith("<image>" + link(collection) + "</image>"), feedUuid);
  EXPECT_EQ(itemWith(link(collection + " " + document)), itemUuid);
  EXPECT_EQ(channelWith(link(collection + " " + document)), Dictionary());
  EXPECT_EQ(channelWith("<atom:link>" + collection + "</atom:link>"), feedUuid);

  const Feed feed = parseChannel("<item>" + link(collection) + "</item>");
  EXPECT_EQ(feed.attributes, feedUuid);
  EXPECT_EQ(feed.episodes.at(0), Dictionary());
}

TEST(FeedParserTest, ShortUuidIsIgnored) {
  const std::string text = std::string(kUuid).substr(1);
  EXPECT_EQ(channelWith("<link>collection/uuid/" + text + "</link>"), Dictionary());
  EXPECT_EQ(channelWith("<link>collection/uuid/</link>"), Dictionary());
  // Characters count, not bytes.
  std::string wide;
  for (int count = 0; count < 36; ++count) wide += "\xC3\xA9";
  EXPECT_EQ(channelWith("<link>collection/uuid/" + wide + "!</link>"),
            (Dictionary{{"QELUUID", wide}}));
}

TEST(FeedParserTest, LinkTextIsNotEmptied) {
  // The order that follows takes all text since the buffer was last emptied.
  EXPECT_EQ(itemWith("<link>12</link><qel:order>3</qel:order>"), (Dictionary{{"order", "123"}}));
}

TEST(FeedParserTest, MarkerSplitOverNestedLinksIsFound) {
  // The buffer of a link that has ended without a marker grows on until an element empties it.
  const std::string text = std::string("collection/uuid/") + kUuid;
  EXPECT_EQ(channelWith("<link>x</link>" + text.substr(0, 9) + "<a>" + text.substr(9) + "</a>"),
            Dictionary());
  EXPECT_EQ(
      channelWith("<a:link><link>" + text.substr(0, 9) + "</link>" + text.substr(9) + "</a:link>"),
      (Dictionary{{"QELUUID", kUuid}}));
  // So does one whose marker has only the beginning of a uuid behind it.
  EXPECT_EQ(channelWith("<a:link><link>" + text.substr(0, 30) + "</link>" + text.substr(30) +
                        "</a:link>"),
            (Dictionary{{"QELUUID", kUuid}}));
}

TEST(FeedParserTest, OwnElements) {
  EXPECT_EQ(itemWith("<qel:uuid>u-1</qel:uuid><qel:order>4</qel:order>"),
            (Dictionary{{"QELUUID", "u-1"}, {"order", "4"}}));
  EXPECT_EQ(channelWith("<qel:uuid>u-2</qel:uuid>"), (Dictionary{{"QELUUID", "u-2"}}));
}

TEST(FeedParserTest, OrderTakesAllTextSinceTheBufferWasEmptied) {
  EXPECT_EQ(itemWith("<title>t</title>\n  <guid>9</guid>\n  <qel:order>3</qel:order>"),
            (Dictionary{{"title", "t"}, {"order", "\n  9\n  3"}}));
}

TEST(FeedParserTest, ItemsFollowInDocumentOrder) {
  const Feed feed = parseChannel(
      "<title>Show</title><item><title>1</title></item><item><title>2</title></item>"
      "<copyright>c</copyright><item/>");
  EXPECT_EQ(feed.attributes, (Dictionary{{"title", "Show"}, {"copyright", "c"}}));
  EXPECT_EQ(feed.episodes, (std::vector<Dictionary>{{{"title", "1"}}, {{"title", "2"}}, {}}));
}

TEST(FeedParserTest, NothingBeforeTheRootOfAFeedCounts) {
  EXPECT_EQ(parse("<x><title>a</title><rss><title>b</title></rss></x>").attributes,
            (Dictionary{{"title", "b"}}));
  EXPECT_EQ(parse("<x><title>a</title><y:rss/></x>").attributes, Dictionary());
}

TEST(FeedParserTest, DocumentWithoutRssIsRefused) {
  for (const char* document :
       {"<feed xmlns=\"http://www.w3.org/2005/Atom\"><title>a</title></feed>", "<html/>", "<RSS/>",
        "<opml><body/></opml>"}) {
    const auto parser = FeedParser::parserWithFeedData(document);
    platform::ErrorSlot error;
    EXPECT_FALSE(parser->parseWithError(error)) << document;
    EXPECT_EQ(error, (platform::ErrorRecord{"QELDomain", 3, "The feed was neither RSS nor Atom"}));
  }
}

TEST(FeedParserTest, TypeThatIsSetFromOutsideDecides) {
  for (const std::string type : {"atom", "opml"}) {
    const auto parser = FeedParser::parserWithFeedData("<feed><title>a</title></feed>");
    parser->setFeedType(type);
    platform::ErrorSlot error;
    EXPECT_EQ(parser->parseWithError(error), type == "atom") << type;
    if (type != "atom") {
      EXPECT_EQ(error,
                (platform::ErrorRecord{"QELDomain", 3, "The feed was neither RSS nor Atom"}));
    }
    EXPECT_EQ(parser->feedAttributes(), Dictionary()) << type;
  }
}

TEST(FeedParserTest, MalformedXMLFailsWithTheParsersRecord) {
  const auto parser = FeedParser::parserWithFeedData("<rss>\n<channel></rss>");
  platform::ErrorSlot error;
  EXPECT_FALSE(parser->parseWithError(error));
  ASSERT_TRUE(error);
  EXPECT_EQ(error->domain, "XML");
  EXPECT_NE(error->description.find("line 2"), std::string::npos) << error->description;
}

TEST(FeedParserTest, ReceiverGetsEachItemOnceItIsWhole) {
  const std::string document =
      "<rss><channel><item><title>a</title><item><title>b</title></item><title>c</title></item>"
      "<item/><item><title>d</title></item></channel></rss>";
  const std::vector<Dictionary> expected = {
      {{"title", "a"}}, {{"title", "b"}}, {}, {{"title", "d"}}};
  EXPECT_EQ(parse(document).episodes, expected);

  const auto parser = FeedParser::parserWithFeedData(document);
  std::vector<Dictionary> received;
  parser->setItemReceiver([&received](const Dictionary& item) { received.push_back(item); });
  platform::ErrorSlot error;
  EXPECT_TRUE(parser->parseWithError(error));
  EXPECT_EQ(received, expected);
  EXPECT_TRUE(parser->episodes().empty());
  EXPECT_EQ(parser->feedAttributes(), (Dictionary{{"title", "c"}}));
}

TEST(FeedParserTest, ReceiverHasGotTheItemsBeforeAFault) {
  const auto parser = FeedParser::parserWithFeedData("<rss><item><title>a</title></item><item>");
  std::vector<Dictionary> received;
  parser->setItemReceiver([&received](const Dictionary& item) { received.push_back(item); });
  platform::ErrorSlot error;
  EXPECT_FALSE(parser->parseWithError(error));
  EXPECT_EQ(received, (std::vector<Dictionary>{{{"title", "a"}}}));
}

TEST(FeedParserTest, ManyNestedLinksStayLinear) {
  // Each end looks for markers in a text that nobody empties. Were it searched anew, this would
  // take minutes, and the test run out of its time.
  constexpr int kDepth = 1'000'000;
  constexpr int kTextSize = 8'000'000;
  std::string content;
  for (int depth = 0; depth < kDepth; ++depth) content += "<link>";
  content.append(kTextSize, 'c');  // the letter that a marker begins with
  for (int depth = 0; depth < kDepth; ++depth) content += "</link>";
  EXPECT_EQ(channelWith(content), Dictionary());
}

}  // namespace
