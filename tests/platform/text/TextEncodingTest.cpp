#include "platform/text/TextEncoding.h"

#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <string_view>

namespace platform {

using namespace std::string_view_literals;

namespace {

struct Conversion {
  std::string_view encoding;
  std::string_view bytes;
  std::string_view utf8;
};

TEST(TextEncodingTest, ConvertsToUTF8) {
  const Conversion conversions[] = {
      {"UTF-8", "caf\xC3\xA9", "café"},
      {"utf8", "", ""},
      {"ISO-8859-1", "caf\xE9", "café"},
      {"windows-1252", "\x80 \x93quoted\x94 \x97", "€ “quoted” —"},
      {"ISO-8859-2", "\xB1\xE6", "ąć"},
      {"KOI8-R", "\xD0\xCF\xC4\xCB\xC1\xD3\xD4", "подкаст"},
      {"windows-1251", "\xEF\xEE\xE4\xEA\xE0\xF1\xF2", "подкаст"},
      {"Shift_JIS", "\x93\xFA\x96\x7B\x8C\xEA", "日本語"},
      {"EUC-JP", "\xC6\xFC\xCB\xDC\xB8\xEC", "日本語"},
      {"EUC-KR", "\xC7\xD1\xB1\xB9\xBE\xEE", "한국어"},
      {"GB2312", "\xD6\xD0\xCE\xC4", "中文"},
      {"Big5", "\xA4\xA4\xA4\xE5", "中文"},
      {"UTF-16LE", "a\0\xE9\0\x3D\xD8\x00\xDE"sv, "aé😀"},
      {"UTF-16BE", "\0a\0\xE9\xD8\x3D\xDE\x00"sv, "aé😀"},
      {"UTF-32LE", "a\0\0\0\x00\xF6\x01\0"sv, "a😀"},
      {"UTF-32BE", "\0\0\0a\0\x01\xF6\x00"sv, "a😀"},
  };
  for (const Conversion& row : conversions) {
    EXPECT_EQ(convertedToUTF8(row.bytes, row.encoding), row.utf8) << row.encoding;
  }
}

TEST(TextEncodingTest, MalformedInputBecomesTheReplacementCharacter) {
  const Conversion conversions[] = {
      {"UTF-8", "a\xFFz", "a\uFFFDz"},
      {"UTF-8", "a\xC3", "a\uFFFD"},
      {"Shift_JIS", "a\x80\xFEz", "a\uFFFD\uFFFDz"},
      {"Shift_JIS", "a\x93", "a\uFFFD"},
      {"EUC-KR", "a\xFFz", "a\uFFFDz"},
      {"GB2312", "a\xFFz", "a\uFFFDz"},
      {"US-ASCII", "caf\xE9", "caf\uFFFD"},
      {"UTF-16LE", "a\0\x3D\xD8z\0"sv, "a\uFFFDz"},
      {"UTF-16BE", "\0a\0"sv, "a\uFFFD"},
  };
  for (const Conversion& row : conversions) {
    EXPECT_EQ(convertedToUTF8(row.bytes, row.encoding), row.utf8)
        << row.encoding << " " << testing::PrintToString(row.bytes);
  }
}

TEST(TextEncodingTest, UnknownEncodingGivesNothing) {
  for (const std::string_view encoding :
       {""sv, "klingon"sv, "UTF-9"sv, "UTF-8\0x"sv, "UTF-16LE\0"sv}) {
    EXPECT_EQ(convertedToUTF8("text", encoding), std::nullopt) << testing::PrintToString(encoding);
    EXPECT_EQ(canonicalEncodingName(encoding), std::nullopt) << testing::PrintToString(encoding);
  }
}

TEST(TextEncodingTest, TextsLongerThanEveryBufferArriveWhole) {
  std::string bytes;
  std::string utf8;
  for (int character = 0; character < 1'000'000; ++character) {
    bytes += "\xD6\xD0";
    utf8 += "中";
  }
  EXPECT_EQ(convertedToUTF8(bytes, "GB2312"), utf8);

  // Every byte grows to three, which is more than the buffer is first made for.
  EXPECT_EQ(convertedToUTF8(std::string(100'000, '\x80'), "windows-1252")->size(), 300'000U);
}

TEST(TextEncodingTest, AliasesLeadToOneName) {
  const struct {
    std::string_view alias;
    std::string_view name;
  } rows[] = {
      {"utf-8", "UTF-8"},           {"UTF8", "UTF-8"},           {"latin1", "ISO-8859-1"},
      {"ISO_8859-1", "ISO-8859-1"}, {"iso8859-1", "ISO-8859-1"}, {"l1", "ISO-8859-1"},
      {"ascii", "US-ASCII"},        {"us-ascii", "US-ASCII"},    {"utf-16", "UTF-16"},
      {"ucs-2", "UTF-16"},
  };
  for (const auto& row : rows) EXPECT_EQ(canonicalEncodingName(row.alias), row.name) << row.alias;
}

}  // namespace

}  // namespace platform
