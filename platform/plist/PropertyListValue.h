#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "platform/plist/PropertyListDictionary.h"
#include "platform/text/Text.h"
#include "platform/time/PointInTime.h"

namespace platform {

/// One value of a property list: a text, a number, a boolean, a date, bytes, an array or a
/// dictionary with text keys.
///
/// Copying a value copies handles of its texts, not their characters.
class PropertyListValue {
 public:
  using Array = std::vector<PropertyListValue>;
  using Dictionary = PropertyListDictionary;
  /// Uninterpreted bytes (the property list's "data"); distinct from text.
  struct Data {
    std::string bytes;
    friend bool operator==(const Data&, const Data&) = default;
  };

  PropertyListValue(Text text) : value_(std::move(text)) {}
  PropertyListValue(const char* text) : value_(Text(text)) {}
  PropertyListValue(const std::string& text) : value_(Text(text)) {}
  PropertyListValue(std::int64_t number) : value_(number) {}
  /// A number that a signed integer can hold is kept as one, so that equal numbers compare equal.
  PropertyListValue(std::uint64_t number);
  PropertyListValue(double number) : value_(number) {}
  PropertyListValue(bool flag) : value_(flag) {}
  PropertyListValue(PointInTime date) : value_(date) {}
  PropertyListValue(Data data) : value_(std::move(data)) {}
  PropertyListValue(Array array) : value_(std::move(array)) {}
  PropertyListValue(Dictionary dictionary) : value_(std::move(dictionary)) {}

  /// The text, or a number's decimal text; absent for any other kind.
  std::optional<Text> asText() const;
  /// The number (a floating-point one without its fraction), or the integer at the start of a text;
  /// the nearest 64-bit number where it lies outside; absent for any other kind.
  std::optional<std::int64_t> asSignedInteger() const;
  /// The same for an unsigned number; a negative one is absent.
  std::optional<std::uint64_t> asUnsignedInteger() const;
  std::optional<PointInTime> asDate() const;
  /// Null for any other kind.
  const Array* asArray() const { return std::get_if<Array>(&value_); }
  const Dictionary* asDictionary() const { return std::get_if<Dictionary>(&value_); }

  using Storage = std::variant<Text, std::int64_t, std::uint64_t, double, bool, PointInTime, Data,
                               Array, Dictionary>;
  const Storage& storage() const { return value_; }

  friend bool operator==(const PropertyListValue&, const PropertyListValue&) = default;

 private:
  Storage value_;
};

struct PropertyListDictionary::Entry {
  Text first;
  PropertyListValue second;
  friend bool operator==(const Entry&, const Entry&) = default;
};

using Dictionary = PropertyListValue::Dictionary;

/// The value under the key, or null when the dictionary has no such key.
const PropertyListValue* valueForKey(const Dictionary& dictionary, std::string_view key);

/// The value under the key as a text (see PropertyListValue::asText); absent without the key, too.
std::optional<Text> textForKey(const Dictionary& dictionary, std::string_view key);

}  // namespace platform
