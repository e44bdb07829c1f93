#include "platform/xml/XMLParser.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstddef>
#include <filesystem>
#include <fstream>
#include <functional>
#include <new>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace platform {

using namespace std::string_literals;
using namespace std::string_view_literals;

namespace {

// Writes the events down as one line: elements as tags, with the value of the attribute "a" where
// there is one, and characters as they come.
class Recorder : public XMLParserEvents {
 public:
  void didStartElement(const XMLName& name, const XMLAttributes& attributes) override {
    events.append("<").append(name.qualified);
    if (const auto value = attributes.value("a")) events.append(" a=").append(*value);
    events.append(">");
    if (duringStart) duringStart();
  }
  void didEndElement(const XMLName& name) override {
    events.append("</").append(name.qualified).append(">");
    if (duringEnd) duringEnd();
  }
  void foundCharacters(std::string_view text) override {
    events.append(text);
    if (duringCharacters) duringCharacters();
  }

  std::string events;
  std::function<void()> duringStart;
  std::function<void()> duringEnd;
  std::function<void()> duringCharacters;
};

// The events of a document, or the description of its fault.
std::string eventsOf(std::string_view document) {
  Recorder recorder;
  ErrorSlot error;
  if (XMLParser(std::string(document), recorder).parse(error))
    return error ? "left an error" : recorder.events;
  return error ? error->description : "gave no error";
}

// An ASCII text in 16 or 32 bits.
std::string widened(std::string_view ascii, std::size_t zerosBefore, std::size_t zerosBehind) {
  std::string result;
  for (const char character : ascii) {
    result.append(zerosBefore, '\0').append(1, character).append(zerosBehind, '\0');
  }
  return result;
}

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
  ErrorSlot error;
  ASSERT_TRUE(XMLParser("<a><b:c><d:e:f/></b:c></a>", names).parse(error)) << error->description;
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
  ErrorSlot error;
  EXPECT_TRUE(XMLParser("<r href='1' x:href='2' empty=''/>", values).parse(error));
}

TEST(XMLParserTest, ReadsEveryEncoding) {
  const std::string ascii = "<?xml version='1.0'?>\n<r>text</r>";
  const std::string utf16 = "<?xml version='1.0' encoding='UTF-16'?>\n<r>text</r>";
  const struct {
    std::string_view name;
    std::string document;
    std::string_view events;
  } rows[] = {
      {"UTF-8", "<r>é</r>", "<r>é</r>"},
      {"UTF-8 with a mark", "\xEF\xBB\xBF<r>é</r>", "<r>é</r>"},
      {"UTF-8 declared", "<?xml version='1.0' encoding='utf-8'?><r>é</r>", "<r>é</r>"},
      {"UTF-8, mark stronger than declaration",
       "\xEF\xBB\xBF<?xml version='1.0' encoding='ISO-8859-1'?><r>é</r>", "<r>é</r>"},
      {"UTF-8, declared as wide", "<?xml version='1.0' encoding='UTF-16'?><r>é</r>", "<r>é</r>"},
      {"UTF-8, declared as still wider", "<?xml version='1.0' encoding='UTF-32'?><r>é</r>",
       "<r>é</r>"},
      {"UTF-16LE with a mark", "\xFF\xFE" + widened(ascii, 0, 1), "<r>text</r>"},
      {"UTF-16BE with a mark", "\xFE\xFF" + widened(ascii, 1, 0), "<r>text</r>"},
      {"UTF-16LE with a mark, declared", "\xFF\xFE" + widened(utf16, 0, 1), "<r>text</r>"},
      {"UTF-16BE with a mark, declared", "\xFE\xFF" + widened(utf16, 1, 0), "<r>text</r>"},
      {"UTF-16LE without a mark", widened(ascii, 0, 1), "<r>text</r>"},
      {"UTF-16BE without a mark", widened(ascii, 1, 0), "<r>text</r>"},
      {"UTF-16LE without a mark, declared", widened(utf16, 0, 1), "<r>text</r>"},
      {"UTF-16BE without a mark, declared", widened(utf16, 1, 0), "<r>text</r>"},
      {"UTF-16LE beyond ASCII", "\xFF\xFE<\0r\0>\0\xE9\0\x3D\xD8\x00\xDE<\0/\0r\0>\0"s,
       "<r>é😀</r>"},
      {"UTF-32LE with a mark", "\xFF\xFE\0\0"s + widened(ascii, 0, 3), "<r>text</r>"},
      {"UTF-32BE with a mark", "\0\0\xFE\xFF"s + widened(ascii, 3, 0), "<r>text</r>"},
      {"UTF-32LE without a mark", widened(ascii, 0, 3), "<r>text</r>"},
      {"UTF-32BE without a mark", widened(ascii, 3, 0), "<r>text</r>"},
      {"ISO-8859-1", "<?xml version='1.0' encoding='ISO-8859-1'?><r a='\xE9'>\xE9 \x93\x80\x94</r>",
       "<r a=é>é “€”</r>"},
      {"latin1", "<?xml version='1.0' encoding='latin1'?><r>\x80</r>", "<r>€</r>"},
      {"US-ASCII", "<?xml version='1.0' encoding='us-ascii'?><r>\x80</r>", "<r>€</r>"},
      {"windows-1252", "<?xml version='1.0' encoding='windows-1252'?><r>\x80</r>", "<r>€</r>"},
      {"Shift_JIS",
       "<?xml version='1.0' encoding='Shift_JIS'?><r>\x93\xFA\x96\x7B\x8C\xEA \x83\x5C</r>",
       "<r>日本語 ソ</r>"},
      {"EUC-KR", "<?xml version='1.0' encoding='EUC-KR'?><r>\xC7\xD1\xB1\xB9</r>", "<r>한국</r>"},
      {"GB2312", "<?xml version='1.0' encoding='GB2312'?><r>\xD6\xD0\xCE\xC4</r>", "<r>中文</r>"},
      {"KOI8-R", "<?xml version='1.0' encoding='KOI8-R'?><r>\xD0\xCF\xC4</r>", "<r>под</r>"},
      {"other quotes and spaces", "<?xml version=\"1.0\"\n\tencoding = \"KOI8-R\" ?><r>\xD0</r>",
       "<r>п</r>"},
      {"malformed bytes", "<?xml version='1.0' encoding='Shift_JIS'?><r>a\xFEz</r>",
       "<r>a\uFFFDz</r>"},
  };
  for (const auto& row : rows) EXPECT_EQ(eventsOf(row.document), row.events) << row.name;
}

TEST(XMLParserTest, SkipsAMarkBehindWhitespace) {
  EXPECT_EQ(eventsOf("\n \xEF\xBB\xBF<?xml version='1.0'?><r>é</r>"), eventsOf("<r>é</r>"));
}

TEST(XMLParserTest, SkipsWhitespaceBeforeTheDeclaration) {
  const std::string latin = "<?xml version='1.0' encoding='ISO-8859-1'?><r>\xE9</r>";
  for (const std::string& space : {" "s, "\n"s, "\r\n\t  \n"s}) {
    EXPECT_EQ(eventsOf(space + "<?xml version='1.0'?><r>text</r>"), "<r>text</r>");
    EXPECT_EQ(eventsOf("\xEF\xBB\xBF" + space + "<?xml version='1.0'?><r>text</r>"), "<r>text</r>");
    EXPECT_EQ(eventsOf(space + latin), "<r>é</r>");
    EXPECT_EQ(eventsOf(widened(space + "<?xml version='1.0'?><r>text</r>", 1, 0)), "<r>text</r>");
  }
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
    Recorder recorder;
    ErrorSlot error;
    EXPECT_FALSE(XMLParser(std::string(row.document), recorder).parse(error))
        << testing::PrintToString(row.document);
    ASSERT_TRUE(error) << testing::PrintToString(row.document);
    EXPECT_EQ(error->domain, "XML");
    EXPECT_EQ(error->code, row.code) << testing::PrintToString(row.document);
    EXPECT_EQ(error->description, row.description) << testing::PrintToString(row.document);
  }
}

TEST(XMLParserTest, EventsBeforeAFaultAreDelivered) {
  Recorder recorder;
  ErrorSlot error;
  EXPECT_FALSE(XMLParser("<r><a>text</a></b>", recorder).parse(error));
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
  for (const std::string& whole : {document, latin, widened(latin, 0, 1), widened(latin, 1, 0),
                                   "\xFF\xFE" + widened(latin, 0, 1), "\xEF\xBB\xBF" + document}) {
    for (std::size_t size = 0; size < whole.size(); ++size) {
      Recorder recorder;
      ErrorSlot error;
      // A buffer of its own, so that a sanitizer sees a read behind the end.
      const std::vector<char> bytes(whole.begin(),
                                    whole.begin() + static_cast<std::ptrdiff_t>(size));
      const std::string_view cut(bytes.data(), bytes.size());
      ASSERT_FALSE(XMLParser(std::string(cut), recorder).parse(error))
          << testing::PrintToString(cut);
      ASSERT_TRUE(error) << testing::PrintToString(cut);
      EXPECT_EQ(error->domain, "XML");
      EXPECT_NE(error->description.find(" at line "), std::string::npos) << error->description;
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

TEST(XMLParserTest, EntityBombsAreRefused) {
  std::string laughs = "<!DOCTYPE r [<!ENTITY e0 'ha ha ha ha'>";
  for (int level = 1; level <= 20; ++level) {
    const std::string below = "&e" + std::to_string(level - 1) + ";";
    laughs += "<!ENTITY e" + std::to_string(level) + " '";
    for (int copy = 0; copy < 10; ++copy) laughs += below;
    laughs += "'>";
  }
  laughs += "]>";
  std::string quadratic = "<!DOCTYPE r [<!ENTITY e '" + std::string(100'000, 'x') + "'>]>\n<r>";
  for (int copy = 0; copy < 10'000; ++copy) quadratic += "&e;";
  quadratic += "</r>";

  struct Counter : XMLParserEvents {
    void didStartElement(const XMLName&, const XMLAttributes&) override {}
    void didEndElement(const XMLName&) override {}
    void foundCharacters(std::string_view text) override { length += text.size(); }
    std::size_t length = 0;
  };
  for (const std::string& bomb :
       {laughs + "\n<r>&e20;</r>", laughs + "\n<r a='&e20;'/>", quadratic}) {
    Counter counter;
    ErrorSlot error;
    ASSERT_FALSE(XMLParser(std::string(bomb), counter).parse(error));
    EXPECT_TRUE(error->description.starts_with(
        "limit on input amplification factor (from DTD and entities) breached at line 2, column "))
        << error->description;
    EXPECT_LT(counter.length, 50'000'000U);
  }
}

std::string chainOfEntities(std::size_t length) {
  std::string chain = "<!ENTITY e0 'x'>";
  for (std::size_t link = 1; link <= length; ++link) {
    chain.append("<!ENTITY e").append(std::to_string(link));
    chain.append(" '&e").append(std::to_string(link - 1)).append(";'>");
  }
  return chain;
}

TEST(XMLParserTest, EntitiesInsideOfEntitiesCannotExhaustTheStack) {
  const struct {
    std::string_view declaration;
    std::string_view root;
    std::string_view events;
  } rows[] = {
      {"", "<r>&eN;</r>", "<r>x</r>"},
      {"", "<r a='&eN;'/>", "<r a=x></r>"},
      {"<!ATTLIST r a CDATA '&eN;'>", "<r/>", "<r a=x></r>"},
  };
  for (const auto& row : rows) {
    const auto outcome = [&row](std::size_t length) {
      const auto withNumber = [length](std::string_view text) {
        std::string result(text);
        if (const std::size_t place = result.find('N'); place != std::string::npos) {
          result.replace(place, 1, std::to_string(length));
        }
        return result;
      };
      return eventsOf("<!DOCTYPE r [\n" + chainOfEntities(length) + withNumber(row.declaration) +
                      "]>" + withNumber(row.root));
    };
    EXPECT_EQ(outcome(1000), row.events);
    for (const std::size_t length : {1001U, 100'000U}) {
      EXPECT_TRUE(
          outcome(length).starts_with("too many entities made of entities at line 2, column "))
          << row.root << " " << outcome(length).substr(0, 200);
    }
  }
}

TEST(XMLParserTest, EntitiesThatHoldNoEntitiesMayBeMany) {
  std::string declarations;
  for (int entity = 0; entity < 5000; ++entity) {
    declarations.append("<!ENTITY e").append(std::to_string(entity)).append(" '&#233;&#37;'>");
  }
  EXPECT_EQ(eventsOf("<!DOCTYPE r [" + declarations + "]><r>&e4999;</r>"), "<r>é%</r>");
}

std::string declaredAttributes(std::size_t count, std::string_view value) {
  std::string declarations;
  for (std::size_t attribute = 0; attribute < count; ++attribute) {
    declarations.append("<!ATTLIST r a").append(std::to_string(attribute)).append(" CDATA ");
    declarations.append(value).append(">");
  }
  return declarations;
}

TEST(XMLParserTest, DeclaredAttributesAreFew) {
  for (const std::string_view value : {"'v'", "#IMPLIED", "#REQUIRED"}) {
    EXPECT_EQ(eventsOf("<!DOCTYPE r [" + declaredAttributes(256, value) + "]><r/>"), "<r></r>");
    EXPECT_TRUE(eventsOf("<!DOCTYPE r [" + declaredAttributes(257, value) + "]><r/>")
                    .starts_with("too many declared attributes at line 1, column "))
        << value;
  }
}

/// Counts the bytes of what it receives.
class Meter : public XMLParserEvents {
 public:
  void didStartElement(const XMLName& name, const XMLAttributes& attributes) override {
    size += name.qualified.size() + attributes.value("a").value_or("").size();
  }
  void didEndElement(const XMLName&) override {}
  void foundCharacters(std::string_view text) override { size += text.size(); }
  std::size_t size = 0;
};

TEST(XMLParserTest, DeclarationsMakeNothingMuchLargerThanTheDocument) {
  const auto repeated = [](std::string_view text, std::size_t count) {
    std::string result;
    for (std::size_t copy = 0; copy < count; ++copy) result += text;
    return result;
  };
  const std::string thousand(1000, 'x');
  const std::string entity = "<!DOCTYPE r [<!ENTITY e '" + thousand + "'>]>\n<r>";
  const std::string elements = "<!DOCTYPE r [<!ENTITY e '" + repeated("<i/>", 100) + "'>]>\n<r>";
  const std::string attribute = "<!DOCTYPE r [<!ATTLIST i a CDATA '" + thousand + "'>]>\n<r>";
  const struct {
    std::string_view name;
    std::string head;
    std::string_view part;
    std::size_t fits;     // so many parts are read
    std::size_t exceeds;  // and so many are not
    std::size_t allowance;
    std::size_t perByte;
  } rows[] = {
      {"text", entity, "&e;", 4250, 4350, 4U << 20, 8},
      {"text in an attribute", entity, "<i a='&e;'/>", 1000, 1100, 1U << 20, 3},
      {"elements", elements, "&e;", 850, 950, 1U << 20, 3},
      {"attributes by default", attribute, "<i/>", 1000, 1100, 1U << 20, 3},
  };
  for (const auto& row : rows) {
    Meter meter;
    ErrorSlot error;
    EXPECT_TRUE(XMLParser(row.head + repeated(row.part, row.fits) + "</r>", meter).parse(error))
        << row.name << ": " << error->description;

    for (const std::size_t count : {row.exceeds, std::size_t{100'000}}) {
      meter.size = 0;
      const std::string document = row.head + repeated(row.part, count) + "</r>";
      EXPECT_FALSE(XMLParser(document, meter).parse(error)) << row.name;
      EXPECT_TRUE(error->description.starts_with(
          "limit on input amplification factor (from DTD and entities) breached at line 2, "))
          << row.name << ": " << error->description;
      const std::size_t root = 1;  // its name, which no text is
      EXPECT_LE(meter.size, root + row.allowance + row.perByte * document.size()) << row.name;
    }
  }
}

TEST(XMLParserTest, DeclarationsRefuseNoLongDocument) {
  const std::string head = "<!DOCTYPE r [<!ENTITY e 'x'><!ATTLIST b c CDATA 'd'>]><r>";
  for (const std::string_view part : {"<a/>", "<a b='c'/>", "<a>b</a>", "&e;", "&lt;"}) {
    std::string document = head;
    while (document.size() < 8'000'000) document += part;
    Meter meter;
    ErrorSlot error;
    EXPECT_TRUE(XMLParser(document + "</r>", meter).parse(error))
        << part << ": " << error->description;
  }
}

TEST(XMLParserTest, HugeDocumentsAreRead) {
  struct Counter : XMLParserEvents {
    void didStartElement(const XMLName&, const XMLAttributes& attributes) override {
      ++elements;
      valueLength += attributes.value("last").value_or("").size();
    }
    void didEndElement(const XMLName&) override { ++ends; }
    void foundCharacters(std::string_view text) override { textLength += text.size(); }
    std::size_t elements = 0;
    std::size_t ends = 0;
    std::size_t textLength = 0;
    std::size_t valueLength = 0;
  };

  std::string nested;
  for (int element = 0; element < 300'000; ++element) nested += "<a>";
  for (int element = 0; element < 300'000; ++element) nested += "</a>";

  std::string attributes = "<a";
  for (int attribute = 0; attribute < 200'000; ++attribute) {
    attributes.append(" a").append(std::to_string(attribute)).append("=''");
  }
  attributes += " last='value'/>";

  // Longer than what the library is given at once, with a tag, a character and a reference across
  // the ends of the pieces.
  constexpr std::size_t kMillions = 50'000'000;
  std::string pieces =
      "<a>" + std::string(kMillions, 'x') + "<b last='" + std::string(kMillions, 'y') + "'/>";
  while (pieces.size() < 135'000'000) pieces += "日本語&lt;";
  const std::size_t units = (pieces.size() - 2 * kMillions - "<a><b last=''/>"sv.size()) / 13;
  pieces += "</a>";

  const struct {
    std::string_view name;
    const std::string& document;
    std::size_t elements;
    std::size_t textLength;
    std::size_t valueLength;
  } rows[] = {
      {"nested", nested, 300'000, 0, 0},
      {"attributes", attributes, 1, 0, 5},
      {"pieces", pieces, 2, kMillions + units * 10, kMillions},
  };
  for (const auto& row : rows) {
    Counter counter;
    ErrorSlot error;
    ASSERT_TRUE(XMLParser(std::string(row.document), counter).parse(error))
        << row.name << error->description;
    EXPECT_EQ(counter.elements, row.elements) << row.name;
    EXPECT_EQ(counter.ends, row.elements) << row.name;
    EXPECT_EQ(counter.textLength, row.textLength) << row.name;
    EXPECT_EQ(counter.valueLength, row.valueLength) << row.name;
  }
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

TEST(XMLParserTest, ADocumentReadInPiecesGivesTheSameEvents) {
  // A tag, and then a character or a reference, across the ends of the pieces.
  constexpr std::size_t kMillions = 50'000'000;
  std::string document =
      "<a>" + std::string(kMillions, 'x') + "<b last='" + std::string(kMillions, 'y') + "'/>";
  while (document.size() < 135'000'000) document += "日本語&lt;";
  document += "</a>";
  SizeCounter whole;
  SizeCounter inPieces;
  ErrorSlot error;
  ASSERT_TRUE(XMLParser(document, whole).parse(error));
  ASSERT_TRUE(XMLParser(std::move(document), inPieces, 0).parse(error));
  EXPECT_EQ(inPieces.sizes, whole.sizes);
  EXPECT_EQ(inPieces.sizes, (std::vector<std::size_t>{1, 1 + kMillions, 1, 1}));
  EXPECT_EQ(inPieces.textSize, whole.textSize);
}

TEST(XMLParserTest, AFaultHasTheSamePlaceInPieces) {
  const std::string document = "<a/>" + std::string(70'000'000, '\n') + "  </b>";
  SizeCounter counter;
  ErrorSlot error;
  EXPECT_FALSE(XMLParser(document, counter, 0).parse(error));
  EXPECT_EQ(error->description, "not well-formed (invalid token) at line 70000001, column 4");
}

TEST(XMLParserTest, AFaultBehindTheFirstPieceHasItsPlace) {
  const std::string document = "<a/>" + std::string(70'000'000, '\n') + "  </b>";
  EXPECT_EQ(eventsOf(document), "not well-formed (invalid token) at line 70000001, column 4");
}

TEST(XMLParserTest, AbortEndsTheParseWithItsRecord) {
  const ErrorRecord record = {"test", 42, "enough"};
  const struct {
    std::string_view name;
    std::function<void()> Recorder::*event;
    std::string_view document;
    std::string_view events;
  } rows[] = {
      {"start", &Recorder::duringStart, "<r><a/></r>", "<r>"},
      {"start of an empty element", &Recorder::duringStart, "<r/>", "<r>"},
      {"end", &Recorder::duringEnd, "<r><a/><b/></r>", "<r><a></a>"},
      {"end of the last element", &Recorder::duringEnd, "<r></r>", "<r></r>"},
      {"text", &Recorder::duringCharacters, "<r>a&amp;b</r>", "<r>a"},
      {"text of an entity", &Recorder::duringCharacters,
       "<!DOCTYPE r [<!ENTITY e 'x&#60;i/>y'>]><r>&e;b</r>", "<r>x"},
      {"before a fault", &Recorder::duringStart, "<r></b>", "<r>"},
  };
  for (const auto& row : rows) {
    Recorder recorder;
    XMLParser parser(std::string(row.document), recorder);
    recorder.*row.event = [&] { parser.abort(record); };
    ErrorSlot error;
    EXPECT_FALSE(parser.parse(error)) << row.name;
    EXPECT_EQ(error, record) << row.name;
    EXPECT_EQ(recorder.events, row.events) << row.name;
  }
}

TEST(XMLParserTest, EventsMayAskForTheirPosition) {
  Recorder recorder;
  XMLParser parser("\n<?xml version='1.0'?>\r\n<r>é<a/>\n  <b/></r>", recorder);
  std::string positions;
  recorder.duringStart = [&] { positions += parser.position() + "; "; };
  recorder.duringEnd = [&] { positions += "/" + parser.position() + "; "; };
  ErrorSlot error;
  EXPECT_EQ(parser.position(), "");
  ASSERT_TRUE(parser.parse(error)) << error->description;
  EXPECT_EQ(positions,
            "line 3, column 1; line 3, column 5; /line 3, column 9; line 4, column 3; "
            "/line 4, column 7; /line 4, column 7; ");
  EXPECT_EQ(parser.position(), "");
}

TEST(XMLParserTest, ExhaustedMemoryInAnEventIsAnError) {
  Recorder recorder;
  recorder.duringCharacters = [] { throw std::bad_alloc(); };
  ErrorSlot error;
  EXPECT_FALSE(XMLParser("<r>a<b/></r>", recorder).parse(error));
  EXPECT_EQ(error, (ErrorRecord{"XML", 1, "out of memory"}));
  EXPECT_EQ(recorder.events, "<r>a");
}

TEST(XMLParserTest, OtherExceptionsOfAnEventPassThrough) {
  Recorder recorder;
  recorder.duringStart = [] { throw std::runtime_error("from the event"); };
  ErrorSlot error;
  EXPECT_THROW(XMLParser("<r/>", recorder).parse(error), std::runtime_error);
  EXPECT_EQ(recorder.events, "<r>");
  EXPECT_EQ(error, std::nullopt);
}

}  // namespace

}  // namespace platform
