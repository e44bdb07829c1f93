#include "platform/text/ASCII.h"

#include <gtest/gtest.h>

#include <string>

namespace {

/// All characters that the function is true of, in the order of their codes.
template <typename Function>
std::string charactersThat(Function holds) {
  std::string characters;
  for (int code = 0; code < 256; ++code) {
    if (holds(static_cast<char>(code))) characters += static_cast<char>(code);
  }
  return characters;
}

constexpr std::string_view kCapitals = "ABCDEFGHIJKLMNOPQRSTUVWXYZ";
constexpr std::string_view kSmalls = "abcdefghijklmnopqrstuvwxyz";

TEST(ASCIITest, CharactersAndTexts) {
  EXPECT_EQ(charactersThat(platform::isASCIIDigit), "0123456789");
  EXPECT_EQ(charactersThat(platform::isASCIILetter), std::string(kCapitals).append(kSmalls));
  const std::string all = charactersThat([](char c) { return platform::isASCII(c); });
  EXPECT_EQ(all.size(), 128U);
  EXPECT_TRUE(platform::isASCII(all));
  EXPECT_TRUE(platform::isASCII(""));
  EXPECT_FALSE(platform::isASCII(all + "\x80"));
}

TEST(ASCIITest, Case) {
  EXPECT_EQ(charactersThat([](char c) { return platform::lowercasedASCII(c) != c; }), kCapitals);
  EXPECT_EQ(charactersThat([](char c) { return platform::uppercasedASCII(c) != c; }), kSmalls);
  for (std::size_t i = 0; i < kCapitals.size(); ++i) {
    EXPECT_EQ(platform::lowercasedASCII(kCapitals[i]), kSmalls[i]);
    EXPECT_EQ(platform::uppercasedASCII(kSmalls[i]), kCapitals[i]);
  }
}

TEST(ASCIITest, HexadecimalDigits) {
  EXPECT_EQ(charactersThat([](char c) { return platform::hexDigitValue(c) != -1; }),
            "0123456789ABCDEFabcdef");
  for (int value = 0; value < 16; ++value) {
    const auto index = static_cast<std::size_t>(value);
    EXPECT_EQ(platform::hexDigitValue(platform::kHexDigits[index]), value);
    EXPECT_EQ(platform::hexDigitValue(platform::kCapitalHexDigits[index]), value);
  }
}

TEST(ASCIITest, Trimmed) {
  const struct {
    std::string_view text, trimmed;
  } rows[] = {
      {"", ""},
      {"a", "a"},
      {" \t\r\n", ""},
      {" \t\r\na b\t\n\r ", "a b"},
      {"\va\f", "\va\f"},
      {"\u00A0a", "\u00A0a"},
      {{" \0 ", 3}, {"\0", 1}},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(platform::trimmed(row.text), row.trimmed) << testing::PrintToString(row.text);
  }
}

}  // namespace
