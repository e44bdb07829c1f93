#include "platform/text/Characters.h"

#include <gtest/gtest.h>

#include <limits>
#include <string>

#include "platform/text/Case.h"
#include "platform/text/Splitting.h"

namespace {

TEST(CharactersTest, TellsUTF8) {
  for (const char* text : {"", "abc", "\u00E9", "a\U0001F600"}) EXPECT_TRUE(platform::isUTF8(text));
  for (const char* text : {"\xE9", "a\xC3", "\xC0\xAF", "\xED\xA0\x80"}) {
    EXPECT_FALSE(platform::isUTF8(text));
  }
}

TEST(CharactersTest, LengthsAndFirstCharacters) {
  const struct {
    std::string_view text;
    std::size_t units, characters;
    std::string_view firstTwo;
  } rows[] = {
      {"", 0, 0, ""},
      {"a", 1, 1, "a"},
      {"abc", 3, 3, "ab"},
      {"äöü", 3, 3, "äö"},
      {"€uro", 4, 4, "€u"},
      {"😀a😀", 5, 3, "😀a"},
      {"\uFFFF\U00010000b", 4, 3, "\uFFFF\U00010000"},
      // Each malformed sequence counts as the one replacement character that stands for it.
      {"\xFFxy", 3, 3, "\xFFx"},
      {"x\xE2\x82", 2, 2, "x\xE2\x82"},
      {"\xF0\x9F\x98", 1, 1, "\xF0\x9F\x98"},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(platform::utf16Length(row.text), row.units) << testing::PrintToString(row.text);
    EXPECT_EQ(platform::characterCount(row.text), row.characters)
        << testing::PrintToString(row.text);
    EXPECT_EQ(platform::firstCharacters(row.text, 2), row.firstTwo)
        << testing::PrintToString(row.text);
  }
  EXPECT_EQ(platform::firstCharacters("abc", 0), "");
  EXPECT_EQ(platform::firstCharacters("abc", std::numeric_limits<std::size_t>::max()), "abc");
}

TEST(CharactersTest, ReplacesControls) {
  const struct {
    std::string text;
    std::string shown;
  } rows[] = {
      {"", ""},
      {"plain ~", "plain ~"},
      {std::string("\0\x1F \x7F~", 5), "\uFFFD\uFFFD \uFFFD~"},
      {"\t\r\n", "\uFFFD\uFFFD\uFFFD"},
      {"\xC2\x80\xC2\x9F\xC2\xA0", "\uFFFD\uFFFD\u00A0"},
      {"\u0153\u20AC\u200F\u2028\uFEFF\U0001F6B6", "\u0153\u20AC\u200F\u2028\uFEFF\U0001F6B6"},
      {"\x9B"
       "2J\xE9",
       "\uFFFD"
       "2J\uFFFD"},                        // in 8-bit terminals an escape sequence
      {"\xC0\x9B[2J", "\uFFFD\uFFFD[2J"},  // an escape in too many bytes
      {"\xE2\x9B.\xF0", "\uFFFD.\uFFFD"},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(platform::withoutControls(row.text), row.shown) << testing::PrintToString(row.text);
    EXPECT_EQ(platform::utf16Length(row.text), platform::utf16Length(row.shown));
  }
}

TEST(CharactersTest, TakesEveryTwoBytesWithoutFault) {
  for (int first = 0; first < 256; ++first) {
    for (int second = 0; second < 256; ++second) {
      const std::string text = {static_cast<char>(first), static_cast<char>(second)};
      const std::size_t characters = platform::characterCount(text);
      EXPECT_TRUE(characters == 1 || characters == 2);
      EXPECT_EQ(platform::firstCharacters(text, characters), text);
      EXPECT_FALSE(platform::lowercased(text).empty());
      EXPECT_FALSE(platform::uppercased(text).empty());
      EXPECT_LE(platform::splitAtWhitespace(text).size(), characters + 1);
    }
  }
}

}  // namespace
