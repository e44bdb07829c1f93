#include "platform/text/FormattedText.h"

#include <gtest/gtest.h>

#include <limits>

#include "platform/text/Text.h"

namespace {

using platform::formattedText;

TEST(FormattedTextTest, InsertsTexts) {
  EXPECT_EQ(formattedText("", {}), "");
  EXPECT_EQ(formattedText("plain", {"unused"}), "plain");
  EXPECT_EQ(formattedText("Type \"%@\" for \"%s\"", {"gif", std::string("Name")}),
            "Type \"gif\" for \"Name\"");
  EXPECT_EQ(formattedText("%@%@", {std::string_view("a"), platform::Text("b")}), "ab");
  EXPECT_EQ(formattedText("%@", {""}), "");
}

TEST(FormattedTextTest, InsertsNullForAbsentTextsAndMissingArguments) {
  const platform::OptionalText absent;
  EXPECT_EQ(formattedText("<%@>", {absent}), "<(null)>");
  EXPECT_EQ(formattedText("<%@>", {platform::OptionalText("x")}), "<x>");
  EXPECT_EQ(formattedText("%@ %s %ld %lu %0.1f", {}), "(null) (null) (null) (null) (null)");
}

TEST(FormattedTextTest, InsertedTextsAreNoFormats) {
  EXPECT_EQ(formattedText("%@ %@", {"100%% %@ %lu", "b"}), "100%% %@ %lu b");
}

TEST(FormattedTextTest, ControlCharactersOfInsertedTextsAloneAreReplaced) {
  const std::string_view title = "a\x1B[2Jb\n";
  EXPECT_EQ(formattedText("\b%@ %ld\n", {title, 1}), "\ba\x1B[2Jb\n 1\n");
  EXPECT_EQ(formattedText("\b%@ %ld\n", {title, 1}, platform::ControlCharacters::kAreReplaced),
            "\ba\uFFFD[2Jb\uFFFD 1\n");
  EXPECT_EQ(formattedText("%@", {}, platform::ControlCharacters::kAreReplaced), "(null)");
}

TEST(FormattedTextTest, InsertsIntegers) {
  EXPECT_EQ(formattedText("%ld %ld", {0, -7}), "0 -7");
  EXPECT_EQ(formattedText("%ld", {std::numeric_limits<std::int64_t>::min()}),
            "-9223372036854775808");
  EXPECT_EQ(formattedText("%lu", {std::numeric_limits<std::uint64_t>::max()}),
            "18446744073709551615");
}

TEST(FormattedTextTest, InsertsNumbersWithOneDecimal) {
  const struct {
    double number;
    std::string_view text;
  } rows[] = {
      {0, "0.0"},
      {25, "25.0"},
      {100, "100.0"},
      {33.333333, "33.3"},
      {66.67, "66.7"},
      {99.96, "100.0"},
      {0.25, "0.2"},
      {0.75, "0.8"},
      {-1.25, "-1.2"},
      {-12.36, "-12.4"},
      {1e15, "1000000000000000.0"},
  };
  for (const auto& row : rows) EXPECT_EQ(formattedText("%0.1f", {row.number}), row.text);
  EXPECT_EQ(formattedText("%0.1f", {std::numeric_limits<double>::infinity()}), "inf");
  EXPECT_EQ(formattedText("%0.1f", {-std::numeric_limits<double>::max()}).size(), 312U);
}

TEST(FormattedTextTest, PercentSigns) {
  EXPECT_EQ(formattedText("-- %lu / %lu (%0.1f%%)", {512U, 2048U, 25.0}), "-- 512 / 2048 (25.0%)");
  EXPECT_EQ(formattedText("%%", {}), "%");
  EXPECT_EQ(formattedText("%%@", {"x"}), "%@");
  EXPECT_EQ(formattedText("%%%@", {"x"}), "%x");
}

TEST(FormattedTextTest, WhatIsNoPlaceholderStays) {
  EXPECT_EQ(formattedText("50%", {"x"}), "50%");
  EXPECT_EQ(formattedText("%d %0.2f %l %", {1}), "%d %0.2f %l %");
  EXPECT_EQ(formattedText("% %@", {"x"}), "% x");
}

}  // namespace
