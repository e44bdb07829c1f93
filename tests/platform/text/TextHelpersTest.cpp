#include "platform/text/TextHelpers.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>

namespace {

using platform::leadingInteger;
using platform::splitAt;
using platform::splitAtWhitespace;
using testing::ElementsAre;

TEST(TextHelpersTest, LowercasedAndUppercased) {
  const struct {
    std::string_view text, lower, upper;
  } rows[] = {
      {"", "", ""},
      {"MP3", "mp3", "MP3"},
      {"@AZ[`az{ 09", "@az[`az{ 09", "@AZ[`AZ{ 09"},
      {"Äpfel", "äpfel", "ÄPFEL"},
      {"straße", "straße", "STRASSE"},
      {"ΟΔΟΣ ΟΔΟΣ", "οδος οδος", "ΟΔΟΣ ΟΔΟΣ"},
      {"Ж€😀", "ж€😀", "Ж€😀"},
      {"ﬁ", "ﬁ", "FI"},
      // The Turkish mapping of I belongs to a locale, not to this function.
      {"Iı", "iı", "II"},
      {"İ", "i̇", "İ"},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(platform::lowercased(row.text), row.lower) << row.text;
    EXPECT_EQ(platform::uppercased(row.text), row.upper) << row.text;
  }
}

TEST(TextHelpersTest, CaseMappingKeepsNUL) {
  EXPECT_EQ(platform::lowercased(std::string_view("A\0B", 3)), std::string_view("a\0b", 3));
  EXPECT_EQ(platform::uppercased(std::string_view("ä\0b", 4)), std::string_view("Ä\0B", 4));
}

TEST(TextHelpersTest, CaseMappingKeepsMalformedSequences) {
  const std::string_view malformed[] = {"\xFF", "\xC3", "\x80", "\xE2\x82", "\xF0\x9F\x98"};
  for (const std::string_view sequence : malformed) {
    const std::string text = std::string("A").append(sequence).append("B");
    EXPECT_EQ(platform::lowercased(text), std::string("a").append(sequence).append("b"));
    EXPECT_EQ(platform::uppercased(sequence), sequence);
  }
}

TEST(TextHelpersTest, ReplacingAll) {
  const struct {
    std::string_view text, target, replacement, result;
  } rows[] = {
      {"", "a", "b", ""},        {"abc", "x", "y", "abc"}, {"a:b:c", ":", "", "abc"},
      {"::", ":", "//", "////"}, {"aaa", "aa", "b", "ba"}, {"aXbX", "X", "XX", "aXXbXX"},
      {"äöä", "ä", "a", "aöa"},  {"abc", "abc", "", ""},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(platform::replacingAll(row.text, row.target, row.replacement), row.result)
        << row.text << " | " << row.target;
  }
}

TEST(TextHelpersTest, SplitAt) {
  EXPECT_THAT(splitAt("", ':'), ElementsAre(""));
  EXPECT_THAT(splitAt("14", ':'), ElementsAre("14"));
  EXPECT_THAT(splitAt("14:30:15", ':'), ElementsAre("14", "30", "15"));
  EXPECT_THAT(splitAt(":", ':'), ElementsAre("", ""));
  EXPECT_THAT(splitAt("::a:", ':'), ElementsAre("", "", "a", ""));
}

TEST(TextHelpersTest, SplittingStopsAtTheMostPieces) {
  EXPECT_THAT(splitAt("a:b:c", ':', 4), ElementsAre("a", "b", "c"));
  EXPECT_THAT(splitAt("a:b:c", ':', 3), ElementsAre("a", "b", "c"));
  EXPECT_THAT(splitAt("a:b:c", ':', 2), ElementsAre("a", "b:c"));
  EXPECT_THAT(splitAt("a:b:c", ':', 1), ElementsAre("a:b:c"));
  EXPECT_THAT(splitAtWhitespace("a b\tc", 4), ElementsAre("a", "b", "c"));
  EXPECT_THAT(splitAtWhitespace("a b\tc", 3), ElementsAre("a", "b", "c"));
  EXPECT_THAT(splitAtWhitespace("a b\tc", 2), ElementsAre("a", "b\tc"));
  EXPECT_THAT(splitAtWhitespace("a b\tc", 1), ElementsAre("a b\tc"));
}

TEST(TextHelpersTest, SplitAtWhitespaceSeparatesAtEverySingleSpace) {
  EXPECT_THAT(splitAtWhitespace(""), ElementsAre(""));
  EXPECT_THAT(splitAtWhitespace("one"), ElementsAre("one"));
  EXPECT_THAT(splitAtWhitespace("one two\tthree"), ElementsAre("one", "two", "three"));
  EXPECT_THAT(splitAtWhitespace(" one  two "), ElementsAre("", "one", "", "two", ""));
}

TEST(TextHelpersTest, SplitAtWhitespaceKnowsTheSpaceSeparators) {
  const std::string_view separators[] = {
      "\t",     " ",      "\u00A0", "\u1680", "\u2000", "\u2001", "\u2002", "\u2003", "\u2004",
      "\u2005", "\u2006", "\u2007", "\u2008", "\u2009", "\u200A", "\u202F", "\u205F", "\u3000"};
  for (const std::string_view separator : separators) {
    const std::string text = std::string("a").append(separator).append("ä");
    EXPECT_THAT(splitAtWhitespace(text), ElementsAre("a", "ä")) << text;
  }
  const std::string_view others[] = {"\n",     "\v",     "\f",     "\r",     "\u0085", "\u180E",
                                     "\u200B", "\u2028", "\u2029", "\uFEFF", "\xA0",   "\xE2\x80"};
  for (const std::string_view other : others) {
    const std::string text = std::string("a").append(other).append("b");
    EXPECT_THAT(splitAtWhitespace(text), ElementsAre(text)) << testing::PrintToString(text);
  }
}

TEST(TextHelpersTest, LeadingInteger) {
  constexpr std::int64_t kMax = std::numeric_limits<std::int64_t>::max();
  constexpr std::int64_t kMin = std::numeric_limits<std::int64_t>::min();
  const struct {
    std::string_view text;
    std::int64_t number;
  } rows[] = {
      {"", 0},
      {"0", 0},
      {"05,", 5},
      {"12abc", 12},
      {"  12", 12},
      {"\t\r\n 12 13", 12},
      {"\u00A0\u300012", 12},
      {"+5", 5},
      {"-5", -5},
      {"-0", 0},
      {"+", 0},
      {"-", 0},
      {"+-5", 0},
      {"-+5", 0},
      {"--5", 0},
      {"++5", 0},
      {"+ 5", 0},
      {"abc", 0},
      {"a1", 0},
      {"1.9", 1},
      {"1e3", 1},
      {"0x10", 0},
      {"٣", 0},
      {"\xFF\x31", 0},
      {"0000000000000000000000000007", 7},
      {"9223372036854775807", kMax},
      {"9223372036854775808", kMax},
      {"99999999999999999999999999x", kMax},
      {"+99999999999999999999999999", kMax},
      {"-9223372036854775808", kMin},
      {"-9223372036854775809", kMin},
      {" -99999999999999999999999999", kMin},
  };
  for (const auto& row : rows) EXPECT_EQ(leadingInteger(row.text), row.number) << row.text;
}

TEST(TextHelpersTest, LengthsAndFirstCharacters) {
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

TEST(TextHelpersTest, EveryTwoBytesAreTakenWithoutFault) {
  for (int first = 0; first < 256; ++first) {
    for (int second = 0; second < 256; ++second) {
      const std::string text = {static_cast<char>(first), static_cast<char>(second)};
      EXPECT_FALSE(platform::lowercased(text).empty());
      EXPECT_FALSE(platform::uppercased(text).empty());
      const std::size_t characters = platform::characterCount(text);
      EXPECT_TRUE(characters == 1 || characters == 2);
      EXPECT_EQ(platform::firstCharacters(text, characters), text);
      std::string joined;
      for (const auto piece : splitAtWhitespace(text)) joined.append(piece).push_back(' ');
      EXPECT_LE(joined.size(), 2 * text.size() + 1);
    }
  }
}

}  // namespace
