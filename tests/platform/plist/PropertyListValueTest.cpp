#include "platform/plist/PropertyListValue.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <limits>
#include <optional>
#include <string>
#include <vector>

namespace platform {
namespace {

constexpr auto kSignedMinimum = std::numeric_limits<std::int64_t>::min();
constexpr auto kSignedMaximum = std::numeric_limits<std::int64_t>::max();
constexpr auto kUnsignedMaximum = std::numeric_limits<std::uint64_t>::max();
constexpr auto kInfinity = std::numeric_limits<double>::infinity();

PropertyListValue signedNumber(std::int64_t number) {
  return number;
}
PropertyListValue unsignedNumber(std::uint64_t number) {
  return number;
}

struct Row {
  const char* name;
  PropertyListValue value;
  std::optional<Text> text;
  std::optional<std::int64_t> asSigned;
  std::optional<std::uint64_t> asUnsigned;
};

const std::vector<Row>& rows() {
  static const std::vector<Row> kRows = {
      {"text", "Pilot", "Pilot", 0, 0},
      {"empty text", "", "", 0, 0},
      {"text of digits", "42", "42", 42, 42},
      {"text that starts with digits", "  12abc", "  12abc", 12, 12},
      {"text with a plus", "+7", "+7", 7, 7},
      {"text with a minus", "-7", "-7", -7, std::nullopt},
      {"text of the largest signed number", "9223372036854775807", "9223372036854775807",
       kSignedMaximum, std::uint64_t{kSignedMaximum}},
      {"text just beyond the signed numbers", "9223372036854775808", "9223372036854775808",
       kSignedMaximum, std::uint64_t{1} << 63},
      {"text of the largest unsigned number", " +18446744073709551615x", " +18446744073709551615x",
       kSignedMaximum, kUnsignedMaximum},
      {"text beyond the unsigned numbers", "18446744073709551616", "18446744073709551616",
       kSignedMaximum, kUnsignedMaximum},
      {"text far beyond the signed numbers below", "-99999999999999999999", "-99999999999999999999",
       kSignedMinimum, std::nullopt},
      {"zero", signedNumber(0), "0", 0, 0},
      {"negative number", signedNumber(-5), "-5", -5, std::nullopt},
      {"smallest signed number", signedNumber(kSignedMinimum), "-9223372036854775808",
       kSignedMinimum, std::nullopt},
      {"small unsigned number", unsignedNumber(5), "5", 5, 5},
      {"first number that only an unsigned one holds", unsignedNumber(std::uint64_t{1} << 63),
       "9223372036854775808", kSignedMaximum, std::uint64_t{1} << 63},
      {"largest unsigned number", unsignedNumber(kUnsignedMaximum), "18446744073709551615",
       kSignedMaximum, kUnsignedMaximum},
      {"whole real", 3.0, "3", 3, 3},
      {"real", 2.9, "2.9", 2, 2},
      {"negative real", -2.9, "-2.9", -2, std::nullopt},
      {"real that is zero without its fraction", -0.5, "-0.5", 0, 0},
      {"real beyond the signed numbers", 1e19, "1e+19", kSignedMaximum, 10000000000000000000U},
      {"real of two to the power of 63", 0x1p63, "9223372036854775808", kSignedMaximum,
       std::uint64_t{1} << 63},
      {"real of minus two to the power of 63", -0x1p63, "-9223372036854775808", kSignedMinimum,
       std::nullopt},
      {"real beyond all integers", 1e300, "1e+300", kSignedMaximum, kUnsignedMaximum},
      {"real below all integers", -1e300, "-1e+300", kSignedMinimum, std::nullopt},
      {"infinity", kInfinity, "inf", kSignedMaximum, kUnsignedMaximum},
      {"minus infinity", -kInfinity, "-inf", kSignedMinimum, std::nullopt},
      {"no number", std::numeric_limits<double>::quiet_NaN(), "nan", std::nullopt, std::nullopt},
      {"true", true, std::nullopt, std::nullopt, std::nullopt},
      {"false", false, std::nullopt, std::nullopt, std::nullopt},
      {"date", PointInTime(std::chrono::seconds(1)), std::nullopt, std::nullopt, std::nullopt},
      {"data", PropertyListValue::Data{"12"}, std::nullopt, std::nullopt, std::nullopt},
      {"array", PropertyListValue::Array{"12"}, std::nullopt, std::nullopt, std::nullopt},
      {"dictionary", Dictionary{{"a", "12"}}, std::nullopt, std::nullopt, std::nullopt},
  };
  return kRows;
}

TEST(PropertyListValueTest, ConvertsToTextAndIntegers) {
  for (const Row& row : rows()) {
    EXPECT_EQ(row.value.asText(), row.text) << row.name;
    EXPECT_EQ(row.value.asSignedInteger(), row.asSigned) << row.name;
    EXPECT_EQ(row.value.asUnsignedInteger(), row.asUnsigned) << row.name;
  }
}

TEST(PropertyListValueTest, OnlyDatesArraysAndDictionariesAreThat) {
  const std::string date = "date";
  const std::string array = "array";
  const std::string dictionary = "dictionary";
  for (const Row& row : rows()) {
    EXPECT_EQ(row.value.asDate().has_value(), row.name == date) << row.name;
    EXPECT_EQ(row.value.asArray() != nullptr, row.name == array) << row.name;
    EXPECT_EQ(row.value.asDictionary() != nullptr, row.name == dictionary) << row.name;
  }
  const PointInTime moment(std::chrono::milliseconds(-1));
  EXPECT_EQ(PropertyListValue(moment).asDate(), moment);
}

TEST(PropertyListValueTest, EqualNumbersAreEqualWhateverTheirSign) {
  EXPECT_TRUE(unsignedNumber(7) == signedNumber(7));
  EXPECT_TRUE(unsignedNumber(std::uint64_t{kSignedMaximum}) == signedNumber(kSignedMaximum));
  EXPECT_FALSE(unsignedNumber(kUnsignedMaximum) == signedNumber(-1));
}

TEST(PropertyListValueTest, KindsAreNeverEqualToOneAnother) {
  EXPECT_FALSE(PropertyListValue("1") == signedNumber(1));
  EXPECT_FALSE(PropertyListValue(1.0) == signedNumber(1));
  EXPECT_FALSE(PropertyListValue(true) == signedNumber(1));
  EXPECT_FALSE(PropertyListValue(PropertyListValue::Data{"1"}) == PropertyListValue("1"));
}

TEST(PropertyListValueTest, ValuesOfOneKindAreEqualInAllTheirParts) {
  using Data = PropertyListValue::Data;
  using Array = PropertyListValue::Array;
  const auto dictionaryOf = [](const char* key, std::int64_t value) {
    return PropertyListValue(Dictionary{{key, value}});
  };
  EXPECT_TRUE(PropertyListValue(Data{"1"}) == PropertyListValue(Data{"1"}));
  EXPECT_FALSE(PropertyListValue(Data{"1"}) == PropertyListValue(Data{"2"}));
  EXPECT_TRUE(dictionaryOf("a", 1) == dictionaryOf("a", 1));
  EXPECT_FALSE(dictionaryOf("a", 1) == dictionaryOf("a", 2));
  EXPECT_FALSE(dictionaryOf("a", 1) == dictionaryOf("b", 1));
  EXPECT_FALSE(PropertyListValue(Array{"1"}) == PropertyListValue(Array{"1", "1"}));
}

TEST(PropertyListValueTest, ACopySharesItsText) {
  const PropertyListValue original = std::string(1000, 'x');
  const PropertyListValue copy = original;  // NOLINT(performance-unnecessary-copy-initialization)
  EXPECT_EQ(copy.asText()->view().data(), original.asText()->view().data());
}

TEST(PropertyListValueTest, ValueForKeyFindsExactKeysOnly) {
  const Dictionary dictionary = {{"PodcastName", "Orbit"}, {"", signedNumber(3)}};
  ASSERT_NE(valueForKey(dictionary, "PodcastName"), nullptr);
  EXPECT_EQ(valueForKey(dictionary, "PodcastName")->asText(), "Orbit");
  ASSERT_NE(valueForKey(dictionary, ""), nullptr);
  EXPECT_EQ(valueForKey(dictionary, "")->asSignedInteger(), 3);
  EXPECT_EQ(valueForKey(dictionary, "podcastname"), nullptr);
  EXPECT_EQ(valueForKey({}, "PodcastName"), nullptr);
}

TEST(PropertyListValueTest, FindsTheTextForAKey) {
  const Dictionary dictionary = {{"text", "Orbit"}, {"number", std::int64_t{3}}, {"flag", true}};
  EXPECT_EQ(textForKey(dictionary, "text"), "Orbit");
  EXPECT_EQ(textForKey(dictionary, "number"), "3");
  EXPECT_EQ(textForKey(dictionary, "flag"), std::nullopt);
  EXPECT_EQ(textForKey(dictionary, "missing"), std::nullopt);
}

}  // namespace
}  // namespace platform
