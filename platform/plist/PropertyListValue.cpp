#include "platform/plist/PropertyListValue.h"

#include <array>
#include <charconv>
#include <cmath>
#include <limits>
#include <type_traits>

#include "platform/text/LeadingInteger.h"

namespace platform {
namespace {

constexpr auto kSignedMaximum = std::numeric_limits<std::int64_t>::max();

template <typename Number>
Text decimalText(Number number) {
  std::array<char, 32> digits{};
  const auto result = std::to_chars(digits.data(), digits.data() + digits.size(), number);
  return {std::string(digits.data(), result.ptr)};
}

/// The number without its fraction, or the nearest one of the type; absent for what is no number.
template <typename Integer>
std::optional<Integer> nearestInteger(double number) {
  if (std::isnan(number)) return std::nullopt;
  using Limits = std::numeric_limits<Integer>;
  // The maximum itself is no double; the power of two above it is one.
  const double beyond = std::ldexp(1.0, Limits::digits);
  const double whole = std::trunc(number);
  if (whole >= beyond) return Limits::max();
  if (whole < static_cast<double>(Limits::min())) return Limits::min();
  return static_cast<Integer>(whole);
}

std::optional<std::uint64_t> leadingUnsignedInteger(std::string_view text) {
  const std::int64_t number = leadingInteger(text);
  if (number < 0) return std::nullopt;
  if (number < kSignedMaximum) return static_cast<std::uint64_t>(number);
  // Too large for a signed number, so the text has digits; its sign is none or a plus.
  text.remove_prefix(text.find_first_of("0123456789"));
  std::uint64_t large = std::numeric_limits<std::uint64_t>::max();
  std::from_chars(text.data(), text.data() + text.size(), large);
  return large;
}

}  // namespace

PropertyListValue::PropertyListValue(std::uint64_t number) : value_(number) {
  if (number <= static_cast<std::uint64_t>(kSignedMaximum)) {
    value_ = static_cast<std::int64_t>(number);
  }
}

std::optional<Text> PropertyListValue::asText() const {
  return std::visit(
      [](const auto& value) -> std::optional<Text> {
        using Value = std::decay_t<decltype(value)>;
        if constexpr (std::is_same_v<Value, Text>) {
          return value;
        } else if constexpr (std::is_arithmetic_v<Value> && !std::is_same_v<Value, bool>) {
          return decimalText(value);
        } else {
          return std::nullopt;
        }
      },
      value_);
}

std::optional<std::int64_t> PropertyListValue::asSignedInteger() const {
  if (const auto* number = std::get_if<std::int64_t>(&value_)) return *number;
  // A number is held as an unsigned one only where a signed one cannot hold it.
  if (std::holds_alternative<std::uint64_t>(value_)) return kSignedMaximum;
  if (const auto* number = std::get_if<double>(&value_)) {
    return nearestInteger<std::int64_t>(*number);
  }
  if (const auto* text = std::get_if<Text>(&value_)) return leadingInteger(*text);
  return std::nullopt;
}

std::optional<std::uint64_t> PropertyListValue::asUnsignedInteger() const {
  if (const auto* number = std::get_if<std::int64_t>(&value_)) {
    if (*number < 0) return std::nullopt;
    return static_cast<std::uint64_t>(*number);
  }
  if (const auto* number = std::get_if<std::uint64_t>(&value_)) return *number;
  if (const auto* number = std::get_if<double>(&value_)) {
    if (*number <= -1.0) return std::nullopt;
    return nearestInteger<std::uint64_t>(*number);
  }
  if (const auto* text = std::get_if<Text>(&value_)) return leadingUnsignedInteger(*text);
  return std::nullopt;
}

std::optional<PointInTime> PropertyListValue::asDate() const {
  if (const auto* date = std::get_if<PointInTime>(&value_)) return *date;
  return std::nullopt;
}

const PropertyListValue* valueForKey(const Dictionary& dictionary, std::string_view key) {
  const auto* const found = dictionary.find(key);
  return found == dictionary.end() ? nullptr : &found->second;
}

std::optional<Text> textForKey(const Dictionary& dictionary, std::string_view key) {
  const PropertyListValue* value = valueForKey(dictionary, key);
  return value ? value->asText() : std::nullopt;
}

}  // namespace platform
