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
  const auto parser = FeedParser::parserWithFeedData(std::string("<rss/>"));
  EXPECT_EQ(parser->feedType(), std::nullopt);
  EXPECT_EQ(parser->feedAttributes(), Dictionary());
  EXPECT_TRUE(parser->episodes().empty());
}

struct Behaviour {
  const char* name;
  std::string content;
  Dictionary expected;
};

TEST(FeedParserTest, ItemsBecomeFeedItemDictionaries) {
  const Behaviour rows[] = {
      {"an item becomes a dictionary",
       "<title>One</title><enclosure url='a.mp3' length='1234' type='audio/mpeg'/>"
       "<pubDate>Tue, 05 Jun 2007 21:30:00 GMT</pubDate><orvane:explicit>Yes</orvane:explicit>",
       {{"title", "One"},
        {"url", "a.mp3"},
        {"contentLength", std::int64_t{1234}},
        {"contentType", "audio/mpeg"},
        {"date", PointInTime(1181079000s)},
        {"advisoryLabel", "Explicit"}}},
      {"CDATA is ordinary text", "<title>a <![CDATA[<b> & ]]>c</title>", {{"title", "a <b> & c"}}},
      {"an empty text is present", "<title/>", {{"title", ""}}},
      {"a later text replaces an earlier one",
       "<title>a</title><title>b</title>",
       {{"title", "b"}}},
      {"the text of nested elements counts",
       "<description>a<b>c</b>d</description>",
       {{"description", "acd"}}},
      {"a nested text element takes the text before it",
       "<description>lost<title>t</title>kept</description>",
       {{"title", "t"}, {"description", "kept"}}},
      {"these are not kept",
       "<orvane:summary>s</orvane:summary><guid>g</guid>"
       "<content:encoded xmlns:content='c'>x</content:encoded>",
       {}},
      {"an unknown label keeps the earlier one",
       "<orvane:explicit>yes</orvane:explicit><orvane:explicit>no</orvane:explicit>",
       {{"advisoryLabel", "Explicit"}}},
      {"a rejected date leaves the key out", "<pubDate>yesterday</pubDate>", {}},
      {"the first category wins",
       "<orvane:category text='Arts'><orvane:category text='Food'/></orvane:category>"
       "<orvane:category text='Comedy'/>",
       {{"category", "Arts"}}},
      {"the last directory image wins",
       "<orvane:image href='a.png'/><orvane:image href='b.png'/>",
       {{"poster", "b.png"}}},
      {"the tool's own elements",
       "<qel:uuid>u-1</qel:uuid><qel:order>4</qel:order>",
       {{"QELUUID", "u-1"}, {"order", "4"}}},
      {"an order takes all text since the buffer was emptied",
       "<title>t</title>\n  <guid>9</guid>\n  <qel:order>3</qel:order>",
       {{"title", "t"}, {"order", "\n  9\n  3"}}},
      {"the text of a link is not emptied",
       "<link>12</link><qel:order>3</qel:order>",
       {{"order", "123"}}},
  };
  for (const Behaviour& row : rows) EXPECT_EQ(itemWith(row.content), row.expected) << row.name;
}

TEST(FeedParserTest, ChannelsBecomeFeedAttributes) {
  const Behaviour rows[] = {
      {"an enclosure outside of an item is lost", "<enclosure url='a' length='1' type='t'/>", {}},
      {"a date", "<pubDate>05 Jun 2007 21:30 GMT</pubDate>", {{"date", PointInTime(1181079000s)}}},
      {"a category without a text does not count",
       "<orvane:category/><orvane:category text='Comedy'/>",
       {{"category", "Comedy"}}},
      {"prefixes are matched as written",
       "<category text='a'>b</category><x:category xmlns:x='y' text='a'/>"
       "<x:image xmlns:x='y' href='a.png'/><uuid>u</uuid><order>1</order>",
       {}},
      {"the directory's image wins over an earlier one",
       "<image><url>i.png</url></image><orvane:image href='o.png'/>",
       {{"poster", "o.png"}}},
      {"the directory's image wins over a later one",
       "<orvane:image href='o.png'/><image><url>i.png</url></image>",
       {{"poster", "o.png"}}},
      {"the first plain image wins",
       "<image><url>a.png</url></image><image><url>b.png</url></image>",
       {{"poster", "a.png"}}},
      {"a directory's image without an address is none",
       "<image><url>a.png</url></image><orvane:image/>",
       {{"poster", "a.png"}}},
      {"an address outside of an image is lost", "<url>a.png</url>", {}},
      {"an image's title replaces the feed's",
       "<title>Show</title><image><title>Logo</title><description>d</description></image>",
       {{"title", "Logo"}, {"description", "d"}}},
      {"the tool's own element", "<qel:uuid>u-2</qel:uuid>", {{"QELUUID", "u-2"}}},
  };
  for (const Behaviour& row : rows) EXPECT_EQ(channelWith(row.content), row.expected) << row.name;
  // Without a declaration a prefix is no error.
  EXPECT_EQ(parse("<rss><channel><orvane:image href='a.png'/></channel></rss>").attributes,
            (Dictionary{{"poster", "a.png"}}));
}

TEST(FeedParserTest, TextElementsGoToTheirKeys) {
  const struct {
    const char* element;
    const char* key;
  } rows[] = {
      {"title", "title"},          {"author", "author"},     {"dc:creator", "author"},
      {"orvane:author", "author"}, {"creator", "author"},    {"description", "description"},
      {"copyright", "copyright"},  {"keywords", "keywords"}, {"orvane:keywords", "keywords"},
      {"other:title", "title"},
  };
  for (const auto& row : rows) {
    const std::string element = row.element;
    const std::string content = "<" + element + "> a\n&amp; b\t</" + element + ">";
    const Dictionary expected{{row.key, " a\n& b\t"}};
    EXPECT_EQ(channelWith(content), expected) << element;
    EXPECT_EQ(itemWith(content), expected) << element;
  }
}

TEST(FeedParserTest, EnclosureLengths) {
  const struct {
    const char* length;
    std::optional<std::int64_t> number;
  } rows[] = {
      {"1234", 1234},       {" 42", 42},
      {"\t+42x", 42},       {"0", std::nullopt},
      {"-3", std::nullopt}, {"abc", std::nullopt},
      {"", std::nullopt},   {"99999999999999999999999", INT64_MAX},
  };
  for (const auto& row : rows) {
    Dictionary expected;
    if (row.number) expected.emplace("contentLength", *row.number);
    EXPECT_EQ(itemWith(std::string("<enclosure length=\"") + row.length + "\"/>"), expected)
        << row.length;
  }
}

TEST(FeedParserTest, AdvisoryLabels) {
  const struct {
    const char* text;
    std::optional<const char*> label;
  } rows[] = {
      {"yes", "Explicit"},    {"YES", "Explicit"},     {"Clean", "Clean"}, {"no", std::nullopt},
      {"true", std::nullopt}, {" yes ", std::nullopt}, {"", std::nullopt},
  };
  for (const auto& row : rows) {
    Dictionary expected;
    if (row.label) expected.emplace("advisoryLabel", *row.label);
    const std::string content = std::string("<orvane:explicit>") + row.text + "</orvane:explicit>";
    EXPECT_EQ(itemWith(content), expected) << row.text;
    EXPECT_EQ(channelWith(content), expected) << row.text;
  }
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

TEST(FeedParserTest, LinksAreSearchedFromTheirBeginning) {
  const std::string before = "<link>" + std::string(100, 'x') + "</link><title>t</title>";
  const Dictionary expected{{"title", "t"}, {"QELUUID", kUuid}};
  EXPECT_EQ(channelWith(before + "<link>collection/uuid/" + kUuid + "</link>"), expected);
  EXPECT_EQ(itemWith(before + "<link>document/uuid/" + kUuid + "</link>"), expected);
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
    const auto parser = FeedParser::parserWithFeedData(std::string(document));
    platform::ErrorSlot error;
    EXPECT_FALSE(parser->parseWithError(error)) << document;
    EXPECT_EQ(error, (platform::ErrorRecord{"QELDomain", 3, "The feed was neither RSS nor Atom"}));
  }
}

TEST(FeedParserTest, TypeThatIsSetFromOutsideDecides) {
  for (const std::string type : {"atom", "opml"}) {
    const auto parser =
        FeedParser::parserWithFeedData(std::string("<feed><title>a</title></feed>"));
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
  const auto parser = FeedParser::parserWithFeedData(std::string("<rss>\n<channel></rss>"));
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
  const auto parser =
      FeedParser::parserWithFeedData(std::string("<rss><item><title>a</title></item><item>"));
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

TEST(FeedParserTest, DirectoryElementsAreReadUnderThePrefixesOfTheParser) {
  const std::string document =
      "<rss><channel><orvane:image href='o.png'/><acme:image href='a.png'/>"
      "<acme:category text='A'/><orvane:category text='O'/><a:acme:category text='N'/>"
      "<item><image href='i.png'/><acme:image href='e.png'/></item></channel></rss>";
  const auto parsed = [&document](std::vector<std::string> prefixes) {
    const auto parser = FeedParser::parserWithFeedData(document);
    parser->setDirectoryPrefixes(std::move(prefixes));
    platform::ErrorSlot error;
    EXPECT_TRUE(parser->parseWithError(error));
    return Feed{parser->feedAttributes(), parser->episodes()};
  };
  EXPECT_EQ(FeedParser::parserWithFeedData(document)->directoryPrefixes(),
            std::vector<std::string>{"orvane"});
  const Feed acme = parsed({"acme"});
  EXPECT_EQ(acme.attributes, (Dictionary{{"poster", "a.png"}, {"category", "A"}}));
  EXPECT_EQ(acme.episodes, (std::vector<Dictionary>{{{"poster", "e.png"}}}));
  const Feed orvane = parsed({"orvane"});
  EXPECT_EQ(orvane.attributes, (Dictionary{{"poster", "o.png"}, {"category", "O"}}));
  EXPECT_EQ(orvane.episodes, std::vector<Dictionary>{Dictionary()});
  EXPECT_EQ(parsed({"orvane", "acme"}).attributes,
            (Dictionary{{"poster", "a.png"}, {"category", "A"}}));
  EXPECT_EQ(parsed({"image"}).episodes, std::vector<Dictionary>{Dictionary()});
}

}  // namespace
