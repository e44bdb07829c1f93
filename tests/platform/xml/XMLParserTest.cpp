#include "platform/xml/XMLParser.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <cstddef>
#include <filesystem>
#include <fstream>
#include <functional>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "tests/support/XMLEventRecorder.h"

namespace platform {

using namespace std::string_literals;
using namespace std::string_view_literals;

namespace {

TEST(XMLParserTest, DeliversElementsAttributesAndText) {
  const struct {
    std::string_view document;
    std::string_view events;
  } rows[] = {
      {"<r/>", "<r></r>"},
      {"<?xml version='1.0'?><r>text</r>", "<r>text</r>"},
      {"<r a='1' b='2'><i>one</i> <i>two</i></r>\n", "<r a=1><i>one</i> <i>two</i></r>"},
      {"<!-- c --><?p?><r>a<!-- c -->b<?p?>c</r><!-- c -->", "<r>abc</r>"},
      {"<r>  kept \n as \t it is  </r>", "<r>  kept \n as \t it is  </r>"},
      {"<r>日本語 😀</r>", "<r>日本語 😀</r>"},
      // CDATA is text like any other.
      {"<r>a <![CDATA[<b> &amp; ]]>c</r>", "<r>a <b> &amp; c</r>"},
      {"<r><![CDATA[]]></r>", "<r></r>"},
      {"<r><![CDATA[a]]]]><![CDATA[>b]]></r>", "<r>a]]>b</r>"},
      // Line breaks become line feeds; references to carriage returns stay.
      {"<r>a\r\nb\rc\nd</r>", "<r>a\nb\nc\nd</r>"},
      {"<r><![CDATA[a\r\nb]]></r>", "<r>a\nb</r>"},
      {"<r>a&#13;&#10;b</r>", "<r>a\r\nb</r>"},
      {"<r a='x\r\ny\tz&#10;'/>", "<r a=x y z\n></r>"},
      // References.
      {"<r>&lt;&gt;&amp;&quot;&apos;&#65;&#x1F600;</r>", "<r><>&\"'A😀</r>"},
      {"<r a='&lt;&gt;&amp;&quot;&apos;&#65;'/>", "<r a=<>&\"'A></r>"},
      {"<!DOCTYPE r [<!ENTITY e 'x&amp;y'>]><r a='&e;'>&e;</r>", "<r a=x&y>x&y</r>"},
      {"<!DOCTYPE r [<!ENTITY e '<i>x</i>'>]><r>&e;&e;</r>", "<r><i>x</i><i>x</i></r>"},
      {"<!DOCTYPE r [<!ATTLIST r a CDATA 'default'>]><r/>", "<r a=default></r>"},
      // Prefixes are not looked up.
      {"<r><undeclared:e a='1'/></r>", "<r><undeclared:e a=1></undeclared:e></r>"},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(eventsOf(row.document), row.events) << testing::PrintToString(row.document);
  }
}

TEST(XMLParserTest, LocalNameFollowsTheFirstColon) {
  struct Names : XMLParserEvents {
    void didStartElement(const XMLName& name, const XMLAttributes&) override {
      seen.append(name.qualified).append("=").append(name.local).append(" ");
    }
    void didEndElement(const XMLName& name) override {
      seen.append("/").append(name.qualified).append("=").append(name.local).append(" ");
    }
    void foundCharacters(std::string_view) override {}
    std::string seen;
  } names;
  std::optional<XMLFault> fault;
  ASSERT_TRUE(XMLParser("<a><b:c><d:e:f/></b:c></a>"s, names).parse(fault)) << fault->description;
  EXPECT_EQ(names.seen, "a=a b:c=c d:e:f=e:f /d:e:f=e:f /b:c=c /a=a ");
}

TEST(XMLParserTest, AttributesAreFoundByQualifiedName) {
  struct Values : XMLParserEvents {
    void didStartElement(const XMLName&, const XMLAttributes& attributes) override {
      EXPECT_EQ(attributes.value("href"), "1");
      EXPECT_EQ(attributes.value("x:href"), "2");
      EXPECT_EQ(attributes.value("empty"), "");
      EXPECT_EQ(attributes.value("hre"), std::nullopt);
      EXPECT_EQ(attributes.value(""), std::nullopt);
    }
    void didEndElement(const XMLName&) override {}
    void foundCharacters(std::string_view) override {}
  } values;
  std::optional<XMLFault> fault;
  EXPECT_TRUE(XMLParser("<r href='1' x:href='2' empty=''/>"s, values).parse(fault));
}

TEST(XMLParserTest, FaultsAreNamedWithLineAndColumn) {
  const struct {
    std::string_view document;
    int code;
    std::string_view description;
  } rows[] = {
      {"", 3, "no element found at line 1, column 1"},
      {" \n\n ", 3, "no element found at line 3, column 2"},
      {"\xEF\xBB\xBF", 3, "no element found at line 1, column 1"},
      {"<?xml version='1.0'?>\n", 3, "no element found at line 2, column 1"},
      {"text", 2, "syntax error at line 1, column 1"},
      {"\n\n  text", 2, "syntax error at line 3, column 3"},
      {"<r>\n<a>\n  </b>\n</r>", 7, "mismatched tag at line 3, column 5"},
      {"<r>\r\n<a>\r  </b>\n</r>", 7, "mismatched tag at line 3, column 5"},
      {"<r>日本語é😀</b>", 7, "mismatched tag at line 1, column 11"},
      {"\xEF\xBB\xBF<r></b>", 7, "mismatched tag at line 1, column 6"},
      {"\n \n<?xml version='1.0'?>\n<r></b>", 7, "mismatched tag at line 4, column 6"},
      {"<r>\n<a></r>", 7, "mismatched tag at line 2, column 6"},
      {"<r>\n<a>", 3, "no element found at line 2, column 4"},
      {"<r><a", 5, "unclosed token at line 1, column 4"},
      {"<r>\n<![CDATA[x\ny", 20, "unclosed CDATA section at line 3, column 2"},
      {"<r/>\n<r/>", 9, "junk after document element at line 2, column 1"},
      {"<r/>text", 9, "junk after document element at line 1, column 5"},
      {"<r>a & b</r>", 4, "not well-formed (invalid token) at line 1, column 7"},
      {"<r>a < b</r>", 4, "not well-formed (invalid token) at line 1, column 7"},
      {"<r a=1/>", 4, "not well-formed (invalid token) at line 1, column 6"},
      {"<r>]]></r>", 4, "not well-formed (invalid token) at line 1, column 6"},
      {"<r a='1'\n a='2'/>", 8, "duplicate attribute at line 2, column 2"},
      {"<r>\n&nbsp;</r>", 11, "undefined entity at line 2, column 1"},
      {"<r a='&nbsp;'/>", 11, "undefined entity at line 1, column 1"},
      {"<r>&#0;</r>", 14, "reference to invalid character number at line 1, column 4"},
      {"<r>&#xFFFF;</r>", 14, "reference to invalid character number at line 1, column 4"},
      {"<r>\n<?xml version='1.0'?></r>", 17,
       "XML or text declaration not at start of entity at line 2, column 1"},
      {"<?xml encoding='UTF-8'?><r/>", 30, "XML declaration not well-formed at line 1, column 7"},
      {"<?xml version='1.0' encoding='#'?><r/>", 30,
       "XML declaration not well-formed at line 1, column 31"},
      {"<!DOCTYPE r [<!ENTITY e '&f;'><!ENTITY f '&e;'>]>\n<r>&e;</r>", 12,
       "recursive entity reference at line 2, column 4"},
      // Bytes that are no UTF-8, and characters that XML excludes.
      {"<r>\ncaf\xE9</r>", 4, "not well-formed (invalid token) at line 2, column 4"},
      {"<r>\xED\xA0\x80</r>", 4, "not well-formed (invalid token) at line 1, column 4"},
      {"<r>\xC0\xAF</r>", 4, "not well-formed (invalid token) at line 1, column 4"},
      {"<r>\xEF\xBF\xBF</r>", 4, "not well-formed (invalid token) at line 1, column 4"},
      {"<r>\x01</r>", 4, "not well-formed (invalid token) at line 1, column 4"},
      {"<r>abc\0</r>"sv, 4, "not well-formed (invalid token) at line 1, column 7"},
      {"\xEF\xBB\xBF<\0r\0/\0>\0"sv, 4, "not well-formed (invalid token) at line 1, column 2"},
      {"<r>\xE2\x82", 6, "partial character at line 1, column 4"},
      // Encodings.
      {"<?xml version='1.0' encoding='klingon'?>\n<r/>", 18,
       "unknown encoding \"klingon\" at line 1, column 31"},
      {"<?xml version='1.0' "
       "encoding='kkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkk"
       "kx'?>\n<r/>",
       18,
       "unknown encoding \"kkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkkk...\" "
       "at "
       "line 1, column 31"},
      {"\n\n<?xml version='1.0'\nencoding=\"UTF-9\"?><r/>", 18,
       "unknown encoding \"UTF-9\" at line 4, column 11"},
      {"<?xml é='1' encoding='UTF-9'?><r/>", 18, "unknown encoding \"UTF-9\" at line 1, column 23"},
      {"<?xml version='1.0' encoding=''?><r/>", 30,
       "XML declaration not well-formed at line 1, column 31"},
      {"<?xml version='1.0' encoding='UTF 8'?><r/>", 30,
       "XML declaration not well-formed at line 1, column 34"},
      {"\0\0<\0"sv, 4, "not well-formed (invalid token) at line 1, column 1"},
      {"<\0\0r"sv, 5, "unclosed token at line 1, column 1"},
      {"<?xml version='1.0' encoding='ISO-8859-1'?>\n<r>\xE9\xE9</b>", 7,
       "mismatched tag at line 2, column 8"},
      {"\xFF\xFE<\0r\0>\0\n\0<\0/\0b\0>\0"sv, 7, "mismatched tag at line 2, column 3"},
  };
  for (const auto& row : rows) {
    XMLEventRecorder recorder;
    std::optional<XMLFault> fault;
    EXPECT_FALSE(XMLParser(std::string(row.document), recorder).parse(fault))
        << testing::PrintToString(row.document);
    ASSERT_TRUE(fault) << testing::PrintToString(row.document);
    EXPECT_EQ(fault->record(), (ErrorRecord{"XML", row.code, std::string(row.description)}))
        << testing::PrintToString(row.document) << fault->record().description;
  }
}

TEST(XMLParserTest, AFaultHoldsItsPlaceApart) {
  XMLEventRecorder recorder;
  std::optional<XMLFault> fault;
  EXPECT_FALSE(XMLParser("<r>\n<a>\n  </b>\n</r>"s, recorder).parse(fault));
  EXPECT_EQ(fault->description, "mismatched tag");
  EXPECT_EQ(fault->position, (TextPosition{.line = 3, .column = 5}));
}

TEST(XMLParserTest, EventsBeforeAFaultAreDelivered) {
  XMLEventRecorder recorder;
  std::optional<XMLFault> fault;
  EXPECT_FALSE(XMLParser("<r><a>text</a></b>"s, recorder).parse(fault));
  EXPECT_EQ(recorder.events, "<r><a>text</a>");
}

TEST(XMLParserTest, DocumentsCutAnywhereAreFaults) {
  const std::string document =
      "\n<?xml version=\"1.0\" encoding=\"UTF-8\"?>\r\n<!DOCTYPE rss [<!ENTITY e \"é\">]>\n"
      "<!-- comment --><?target data?>\n<rss version='2.0' xmlns:x='y'><channel><title>a &amp; &e; "
      "&#x1F600; 😀</title><x:i href=\"1\"/><![CDATA[ <b> ]]></channel></rss>";
  const std::string latin =
      "<?xml version='1.0' encoding='ISO-8859-1'?><rss><title>caf\xE9</title></rss>";
  ASSERT_EQ(eventsOf(document),
            "<rss><channel><title>a & é 😀 😀</title><x:i></x:i> <b> </channel></rss>");
  std::string wide = "\xFF\xFE";
  for (const char character : latin) wide.append(1, character).append(1, '\0');
  for (const std::string& whole :
       {document, latin, wide, wide.substr(2), "\xEF\xBB\xBF" + document}) {
    for (std::size_t size = 0; size < whole.size(); ++size) {
      XMLEventRecorder recorder;
      std::optional<XMLFault> fault;
      const std::string cut = whole.substr(0, size);
      ASSERT_FALSE(XMLParser(cut, recorder).parse(fault)) << testing::PrintToString(cut);
      ASSERT_TRUE(fault) << testing::PrintToString(cut);
      EXPECT_NE(fault->description, "") << testing::PrintToString(cut);
    }
  }
}

TEST(XMLParserTest, ExternalEntitiesAndDTDsAreNotLoaded) {
  const std::filesystem::path secret = std::filesystem::path(testing::TempDir()) /
                                       ("XMLParserTest-" + std::to_string(getpid()) + ".txt");
  std::ofstream(secret) << "<!ENTITY loaded 'SECRET'>SECRET";
  const std::string path = secret.string();
  const struct {
    std::string document;
    std::string_view events;
  } rows[] = {
      {"<!DOCTYPE r [<!ENTITY e SYSTEM '" + path + "'>]><r>[&e;]</r>", "<r>[]</r>"},
      {"<!DOCTYPE r [<!ENTITY e PUBLIC 'x' 'file://" + path + "'>]><r>[&e;]</r>", "<r>[]</r>"},
      {"<!DOCTYPE r SYSTEM '" + path + "'><r>[&loaded;]</r>", "<r>[]</r>"},
      {"<!DOCTYPE r PUBLIC 'x' 'file://" + path + "'><r>[&loaded;]</r>", "<r>[]</r>"},
      {"<!DOCTYPE r [<!ENTITY % p SYSTEM '" + path + "'>%p;]><r>[&loaded;]</r>", "<r>[]</r>"},
      {"<?xml version='1.0' standalone='yes'?><!DOCTYPE r SYSTEM '" + path + "'><r>&loaded;</r>",
       "undefined entity at line 1, column "},
      {"<!DOCTYPE r [<!ENTITY e SYSTEM '" + path + "'>]><r a='&e;'/>",
       "reference to external entity in attribute at line 1, column "},
  };
  for (const auto& row : rows) {
    EXPECT_TRUE(eventsOf(row.document).starts_with(row.events))
        << row.document << "\n  gave " << eventsOf(row.document);
  }
  std::filesystem::remove(secret);
}

/// Adds up the sizes of what an XMLParser finds.
struct SizeCounter : XMLParserEvents {
  void didStartElement(const XMLName& name, const XMLAttributes& attributes) override {
    sizes.push_back(name.qualified.size() + attributes.value("last").value_or("").size());
  }
  void didEndElement(const XMLName& name) override { sizes.push_back(name.qualified.size()); }
  void foundCharacters(std::string_view text) override { textSize += text.size(); }
  std::vector<std::size_t> sizes;
  std::size_t textSize = 0;
};

TEST(XMLParserTest, ReadsDeepNestingAndManyAttributes) {
  constexpr std::size_t kDepth = 300'000;
  std::string attributes = "<a";
  for (int attribute = 0; attribute < 200'000; ++attribute) {
    attributes.append(" a").append(std::to_string(attribute)).append("=''");
  }
  attributes += " last='value'/>";
  SizeCounter nested;
  SizeCounter wide;
  std::optional<XMLFault> fault;
  EXPECT_TRUE(XMLParser(repeated("<a>", kDepth) + repeated("</a>", kDepth), nested).parse(fault));
  EXPECT_EQ(nested.sizes, std::vector<std::size_t>(2 * kDepth, 1));
  EXPECT_TRUE(XMLParser(attributes, wide).parse(fault));
  EXPECT_EQ(wide.sizes, (std::vector<std::size_t>{6, 1}));
}

TEST(XMLParserTest, ADocumentReadInPiecesGivesTheSameEvents) {
  // A tag, and then a character or a reference, across the ends of the pieces.
  constexpr std::size_t kMillions = 50'000'000;
  constexpr std::string_view kUnit = "日本語&lt;";
  constexpr std::size_t kUnits = 3'000'000;
  const std::string document = "<a>" + std::string(kMillions, 'x') + "<b last='" +
                               std::string(kMillions, 'y') + "'/>" + repeated(kUnit, kUnits) +
                               "</a>";
  for (const std::size_t largestWholeSize : {XMLParser::kLargestWholeSize, std::size_t{0}}) {
    SizeCounter counter;
    std::optional<XMLFault> fault;
    ASSERT_TRUE(XMLParser(document, counter, largestWholeSize).parse(fault)) << fault->description;
    EXPECT_EQ(counter.sizes, (std::vector<std::size_t>{1, 1 + kMillions, 1, 1}));
    EXPECT_EQ(counter.textSize, kMillions + 10 * kUnits);
  }
}

TEST(XMLParserTest, AFaultHasTheSamePlaceInPieces) {
  const std::string document = "<a/>" + std::string(70'000'000, '\n') + "  </b>";
  for (const std::size_t largestWholeSize : {XMLParser::kLargestWholeSize, std::size_t{0}}) {
    SizeCounter counter;
    std::optional<XMLFault> fault;
    EXPECT_FALSE(XMLParser(document, counter, largestWholeSize).parse(fault));
    EXPECT_EQ(fault->record().description,
              "not well-formed (invalid token) at line 70000001, column 4");
  }
}

/// The text and then a failure, or its end.
ByteSource sourceOf(std::string text, std::size_t expectedSize, bool fails) {
  return {expectedSize,
          [text = std::move(text), fails](std::span<char> room,
                                          ErrorSlot& error) mutable -> std::optional<std::size_t> {
            if (text.empty() && fails) {
              error = ErrorRecord{"test", 1, "no more"};
              return std::nullopt;
            }
            const std::size_t size = text.copy(room.data(), room.size());
            text.erase(0, size);
            return size;
          }};
}

TEST(XMLParserTest, TheExpectedSizeMayBeWrong) {
  for (const std::string& start :
       {""s, "\xEF\xBB\xBF"s, "\n\n"s, "<?xml version='1.0' encoding='KOI8-R'?>"s}) {
    const std::string document = start + "<r a='b'>text</r>";
    for (const std::size_t size : {0U, 1U, 5U, 30U, 1000U}) {
      XMLEventRecorder recorder;
      std::optional<XMLFault> fault;
      EXPECT_TRUE(XMLParser(sourceOf(document, size, false), recorder).parse(fault))
          << fault->description << start << size;
      EXPECT_EQ(recorder.events, "<r a=b>text</r>") << start << size;
    }
  }
}

TEST(XMLParserTest, ADocumentThatCannotBeReadIsAFaultWithThatCause) {
  for (const std::string_view document :
       {"", "<r>", "<r/>", "<?xml version='1.0' encoding='KOI8-R'?><r/>"}) {
    XMLEventRecorder recorder;
    std::optional<XMLFault> fault;
    EXPECT_FALSE(XMLParser(sourceOf(std::string(document), 100, true), recorder).parse(fault));
    EXPECT_EQ(fault->record(), (ErrorRecord{"test", 1, "no more"})) << document;
    EXPECT_EQ(fault->description, "no more") << document;
  }
}

constexpr const char* kTooLong = "a tag or text too long for the parser at line ";
TEST(XMLParserTest, WhatTheLibraryCannotHoldIsAFault) {
  constexpr std::size_t kTooMuch = 2'147'000'000;  // for its buffer; it need not come
  std::optional<XMLFault> fault;
  XMLEventRecorder recorder;
  EXPECT_FALSE(XMLParser(sourceOf("<r/>", kTooMuch, false), recorder, kTooMuch + 1).parse(fault));
  EXPECT_EQ(fault->record().description, kTooLong + std::string("1, column 1"));
}

TEST(XMLParserTest, ATagThatNeverEndsIsNotReadOn) {
  std::size_t size = 0;
  const auto read = [&size](std::span<char> room, ErrorSlot&) {
    std::fill(room.begin(), room.end(), 'x');
    if (size == 0) std::string_view("<r>\n<a b='").copy(room.data(), room.size());
    return size += room.size(), std::optional(room.size());
  };
  std::optional<XMLFault> fault;
  XMLEventRecorder recorder;
  XMLParser(ByteSource(1000, read), recorder, 100).parse(fault);
  EXPECT_EQ(fault->record().description, kTooLong + std::string("2, column 1"));
  EXPECT_LE(size, std::size_t{200} << 20U);
}

TEST(XMLParserTest, AbortEndsTheParseAtThePlaceOfTheEvent) {
  const struct {
    std::string_view name;
    std::function<void()> XMLEventRecorder::*event;
    std::string_view document;
    std::string_view events;
    TextPosition position;
  } rows[] = {
      {"start", &XMLEventRecorder::duringStart, "<r><a/></r>", "<r>", {1, 1}},
      {"start of an empty element", &XMLEventRecorder::duringStart, "<r/>", "<r>", {1, 1}},
      {"end", &XMLEventRecorder::duringEnd, "<r>é<a/><b/></r>", "<r>é<a></a>", {1, 9}},
      {"end of the last element", &XMLEventRecorder::duringEnd, "<r>\n</r>", "<r>\n</r>", {2, 1}},
      {"text", &XMLEventRecorder::duringCharacters, "<r>a&amp;b</r>", "<r>a", {1, 4}},
      {"text of an entity",
       &XMLEventRecorder::duringCharacters,
       "<!DOCTYPE r [<!ENTITY e 'x&#60;i/>y'>]><r>&e;b</r>",
       "<r>x",
       {1, 43}},
      {"before a fault", &XMLEventRecorder::duringStart, "<r></b>", "<r>", {1, 1}},
      {"behind white space",
       &XMLEventRecorder::duringStart,
       "\n <?xml version='1.0'?><r/>",
       "<r>",
       {2, 23}},
      {"in a later line",
       &XMLEventRecorder::duringStart,
       "\n<?xml version='1.0'?>\r\n<r/>",
       "<r>",
       {3, 1}},
  };
  for (const auto& row : rows) {
    XMLEventRecorder recorder;
    XMLParser parser(std::string(row.document), recorder);
    recorder.*row.event = [&] { parser.abort("enough"); };
    std::optional<XMLFault> fault;
    ASSERT_FALSE(parser.parse(fault)) << row.name;
    EXPECT_EQ(fault->description, "enough") << row.name;
    EXPECT_EQ(fault->position, row.position) << row.name << fault->position.text();
    EXPECT_EQ(recorder.events, row.events) << row.name;
  }
}

}  // namespace
}  // namespace platform
