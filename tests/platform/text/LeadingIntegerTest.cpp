#include "platform/text/LeadingInteger.h"

#include <gtest/gtest.h>

#include <limits>

namespace {

using platform::leadingInteger;

TEST(LeadingIntegerTest, ReadsUpToTheFirstOtherCharacter) {
  constexpr std::int64_t kMax = std::numeric_limits<std::int64_t>::max();
  constexpr std::int64_t kMin = std::numeric_limits<std::int64_t>::min();
  const struct {
    std::string_view text;
    std::int64_t number;
  } rows[] = {
      {"05,", 5},
      {"12abc", 12},
      {"  12", 12},
      {"\t\r\n 12 13", 12},
      {"\u00A0\u300012", 12},
      {"+5", 5},
      {"-5", -5},
      {"1.9", 1},
      {"1e3", 1},
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
  for (const char* text : {"", "0", "-0", "+", "-", "+-5", "-+5", "--5", "++5", "+ 5", "abc", "a1",
                           "0x10", "٣", "\xFF\x31"}) {
    EXPECT_EQ(leadingInteger(text), 0) << text;
  }
}

}  // namespace
