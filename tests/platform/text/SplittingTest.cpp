#include "platform/text/Splitting.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

namespace {

using platform::splitAt;
using platform::splitAtWhitespace;
using testing::ElementsAre;

TEST(SplittingTest, SplitAt) {
  EXPECT_THAT(splitAt("", ':'), ElementsAre(""));
  EXPECT_THAT(splitAt("14", ':'), ElementsAre("14"));
  EXPECT_THAT(splitAt("14:30:15", ':'), ElementsAre("14", "30", "15"));
  EXPECT_THAT(splitAt(":", ':'), ElementsAre("", ""));
  EXPECT_THAT(splitAt("::a:", ':'), ElementsAre("", "", "a", ""));
}

TEST(SplittingTest, StopsAtTheMostPieces) {
  EXPECT_THAT(splitAt("a:b:c", ':', 4), ElementsAre("a", "b", "c"));
  EXPECT_THAT(splitAt("a:b:c", ':', 3), ElementsAre("a", "b", "c"));
  EXPECT_THAT(splitAt("a:b:c", ':', 2), ElementsAre("a", "b:c"));
  EXPECT_THAT(splitAt("a:b:c", ':', 1), ElementsAre("a:b:c"));
  EXPECT_THAT(splitAtWhitespace("a b\tc", 4), ElementsAre("a", "b", "c"));
  EXPECT_THAT(splitAtWhitespace("a b\tc", 3), ElementsAre("a", "b", "c"));
  EXPECT_THAT(splitAtWhitespace("a b\tc", 2), ElementsAre("a", "b\tc"));
  EXPECT_THAT(splitAtWhitespace("a b\tc", 1), ElementsAre("a b\tc"));
}

TEST(SplittingTest, SplitAtWhitespaceSeparatesAtEverySingleSpace) {
  EXPECT_THAT(splitAtWhitespace(""), ElementsAre(""));
  EXPECT_THAT(splitAtWhitespace("one"), ElementsAre("one"));
  EXPECT_THAT(splitAtWhitespace("one two\tthree"), ElementsAre("one", "two", "three"));
  EXPECT_THAT(splitAtWhitespace(" one  two "), ElementsAre("", "one", "", "two", ""));
}

TEST(SplittingTest, SplitAtWhitespaceKnowsTheSpaceSeparators) {
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

}  // namespace
