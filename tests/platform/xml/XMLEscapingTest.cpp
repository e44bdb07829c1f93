#include "platform/xml/XMLEscaping.h"

#include <gtest/gtest.h>

#include <string>
#include <string_view>

namespace platform {

using namespace std::string_view_literals;

namespace {

std::string escapedText(std::string_view text) {
  std::string output;
  appendEscapedText(output, text);
  return output;
}

std::string escapedAttribute(std::string_view value) {
  std::string output;
  appendEscapedAttribute(output, value);
  return output;
}

TEST(XMLEscapingTest, EscapesWhatAParserWouldReadDifferently) {
  const struct {
    std::string_view plain;
    std::string_view text;
    std::string_view attribute;
  } rows[] = {
      {"", "", ""},
      {"plain text", "plain text", "plain text"},
      {"a&b", "a&amp;b", "a&amp;b"},
      {"&amp;", "&amp;amp;", "&amp;amp;"},
      {"<b>", "&lt;b&gt;", "&lt;b&gt;"},
      {"]]>", "]]&gt;", "]]&gt;"},
      {"\"it's\"", "\"it's\"", "&quot;it's&quot;"},
      {"a\tb", "a\tb", "a&#9;b"},
      {"a\nb", "a\nb", "a&#10;b"},
      {"a\rb", "a&#13;b", "a&#13;b"},
      {"\r\n", "&#13;\n", "&#13;&#10;"},
      {"  a  ", "  a  ", "  a  "},
      {"&&", "&amp;&amp;", "&amp;&amp;"},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(escapedText(row.plain), row.text) << testing::PrintToString(row.plain);
    EXPECT_EQ(escapedAttribute(row.plain), row.attribute) << testing::PrintToString(row.plain);
    EXPECT_EQ(row.plain.size() + sizeOfReferences(row.plain), row.attribute.size())
        << testing::PrintToString(row.plain);
  }
  EXPECT_EQ(sizeOfReferences("\x01\xC3\xA9\xFF"), 0U);  // what is left out shortens nothing
}

TEST(XMLEscapingTest, AppendsToWhatIsThere) {
  std::string output = "<a b=\"";
  appendEscapedAttribute(output, "<\x01é");
  output += "\">";
  appendEscapedText(output, "1 > 0");
  EXPECT_EQ(output, "<a b=\"&lt;é\">1 &gt; 0");
}

TEST(XMLEscapingTest, KeepsEveryCharacterThatXMLCanHold) {
  for (const std::string_view text :
       {"\x7F"sv, "\u0080"sv, "\u0085"sv, "é"sv, "\u07FF"sv, "\u0800"sv, "\u2028"sv, "日本語"sv,
        "\uD7FF"sv, "\uE000"sv, "\uFEFF"sv, "\uFFFD"sv, "\U00010000"sv, "😀"sv, "\U0001FFFE"sv,
        "\U0010FFFF"sv}) {
    EXPECT_EQ(escapedText(text), text) << testing::PrintToString(text);
    EXPECT_EQ(escapedAttribute(text), text) << testing::PrintToString(text);
  }
}

TEST(XMLEscapingTest, LeavesOutWhatXMLCannotHold) {
  const struct {
    std::string_view plain;
    std::string_view escaped;
  } rows[] = {
      {"a\0b"sv, "ab"},
      {"\x01\x08\x0B\x0C\x0E\x1F"sv, ""},
      {"a\x1B[0m"sv, "a[0m"},
      {"a\xEF\xBF\xBEz"sv, "az"},      // U+FFFE
      {"a\xEF\xBF\xBFz"sv, "az"},      // U+FFFF
      {"a\xED\xA0\x80z"sv, "az"},      // a surrogate
      {"a\xED\xBF\xBFz"sv, "az"},      // the last surrogate
      {"a\x80z"sv, "az"},              // a stray continuation byte
      {"a\xFFz"sv, "az"},              // a byte that occurs nowhere in UTF-8
      {"a\xC3"sv, "a"},                // cut at the end
      {"a\xE2\x82"sv, "a"},            // cut at the end
      {"a\xC3z"sv, "az"},              // cut by another character
      {"a\xE2\x82z"sv, "az"},          // cut by another character
      {"a\xC3\xC3\xA9z"sv, "aéz"},     // cut by a whole one
      {"a\xE2\x82<"sv, "a&lt;"},       // cut by markup
      {"a\xC0\xAFz"sv, "az"},          // an overlong "/"
      {"a\xE0\x80\xBCz"sv, "az"},      // an overlong "<"
      {"a\xF0\x80\x80\xBCz"sv, "az"},  // an overlong "<"
      {"a\xF4\x90\x80\x80z"sv, "az"},  // beyond U+10FFFF
      {"a\xF5\x80\x80\x80z"sv, "az"},  // beyond U+10FFFF
  };
  for (const auto& row : rows) {
    EXPECT_EQ(escapedText(row.plain), row.escaped) << testing::PrintToString(row.plain);
    EXPECT_EQ(escapedAttribute(row.plain), row.escaped) << testing::PrintToString(row.plain);
  }
}

TEST(XMLEscapingTest, TellsWhatXMLCanHoldWhole) {
  struct Row {
    std::string_view text;
    bool holds;
  };
  const Row rows[] = {
      {"", true},
      {"a\t\n\r<>&\"", true},
      {"\xC3\xA9\xF0\x9F\x8E\xA7\xEF\xBF\xBD", true},
      {"a\0b"sv, false},
      {"\x0B", false},
      {"\xFF", false},
      {"\xC3", false},
      {"\xED\xA0\x80", false},  // a surrogate
      {"\xEF\xBF\xBE", false},  // U+FFFE
  };
  for (const Row& row : rows) EXPECT_EQ(isXMLText(row.text), row.holds) << row.text;
}

TEST(XMLEscapingTest, TextReadBackIsWhatXMLCanHold) {
  EXPECT_EQ(textReadBack("a <&>\"\t\n\r"), "a <&>\"\t\n\r");
  EXPECT_EQ(textReadBack("\x01"
                         "a\xC3\xBC\xE9\xE2\x82"
                         "b\xEF\xBF\xBF"),
            "a\xC3\xBC"
            "b");
}

}  // namespace
}  // namespace platform
