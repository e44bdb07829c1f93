#include "platform/text/Base64.h"

#include <gtest/gtest.h>

namespace {

using namespace std::string_literals;

TEST(Base64Test, TextStandsForBytes) {
  const struct {
    std::string bytes, text;
  } rows[] = {
      {"", ""},
      {"f", "Zg=="},
      {"fo", "Zm8="},
      {"foo", "Zm9v"},
      {"foob", "Zm9vYg=="},
      {"fooba", "Zm9vYmE="},
      {"\0"s, "AA=="},
      {"\xFB\xFF\xBF", "+/+/"},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(platform::bytesFromBase64(row.text), row.bytes) << row.text;
  }
}

TEST(Base64Test, WhiteSpaceIsIgnoredWhereverItStands) {
  EXPECT_EQ(platform::bytesFromBase64(" Z\tm\r8\n = \n"), "fo");
  EXPECT_EQ(platform::bytesFromBase64("Zg= ="), "f");
}

TEST(Base64Test, OtherTextsAreNone) {
  for (const char* text :
       {"Z", "Zg", "Zg=", "Zg===", "Zm8", "Zm9v=", "====", "Zg==Zg==", "Zg==Zm9v", "Z=g=", "Z-__",
        "Zm9v!", "Zm9\xC3\xA4", "Zm\x0B==", "\xFFm9v"}) {
    EXPECT_EQ(platform::bytesFromBase64(text), std::nullopt) << text;
  }
  EXPECT_EQ(platform::bytesFromBase64(std::string_view("Zm\0v", 4)), std::nullopt);
}

}  // namespace
