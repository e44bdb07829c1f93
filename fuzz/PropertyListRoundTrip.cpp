#include "fuzz/PropertyListRoundTrip.h"

#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstddef>
#include <type_traits>
#include <variant>

#include "fuzz/FuzzTarget.h"
#include "platform/plist/PropertyListReader.h"
#include "platform/plist/PropertyListWriter.h"
#include "platform/xml/XMLEscaping.h"

namespace {

using platform::Dictionary;
using platform::PointInTime;
using platform::PropertyListValue;
using platform::Text;
using Array = PropertyListValue::Array;

/// The bytes that the value takes, about; counting ends beyond the limit.
std::size_t sizeOf(const PropertyListValue& value, std::size_t limit) {
  constexpr std::size_t kSizeOfTags = 32;
  std::size_t size = kSizeOfTags;
  if (const auto* text = std::get_if<Text>(&value.storage())) {
    size += text->size();
  } else if (const auto* data = std::get_if<PropertyListValue::Data>(&value.storage())) {
    size += data->bytes.size();
  } else if (const Array* array = value.asArray()) {
    for (const PropertyListValue& element : *array) {
      if (size > limit) break;
      size += sizeOf(element, limit - size);
    }
  } else if (const Dictionary* dictionary = value.asDictionary()) {
    for (const auto& [key, entry] : *dictionary) {
      if (size > limit) break;
      size += key.size() + sizeOf(entry, limit - size);
    }
  }
  return size;
}

PointInTime wholeSecond(PointInTime date) {
  const auto second = std::chrono::floor<std::chrono::seconds>(date);
  // The first second is held in part only.
  const bool isFirst = second == std::chrono::floor<std::chrono::seconds>(PointInTime::min());
  return isFirst ? PointInTime::min() : PointInTime(second);
}

/// Whether the value is of a kind that is written.
bool isWritten(const PropertyListValue& value) {
  return std::visit(
      [](const auto& held) {
        using Held = std::decay_t<decltype(held)>;
        return !std::is_same_v<Held, double> && !std::is_same_v<Held, bool> &&
               !std::is_same_v<Held, PropertyListValue::Data>;
      },
      value.storage());
}

PropertyListValue valueAfterWriting(const PropertyListValue& value) {
  if (const auto* text = std::get_if<Text>(&value.storage())) return {xmlText(*text)};
  if (const auto date = value.asDate()) return {wholeSecond(*date)};
  if (const Dictionary* dictionary = value.asDictionary()) return {afterWriting(*dictionary)};
  const Array* array = value.asArray();
  if (array == nullptr) return value;
  Array result;
  for (const PropertyListValue& element : *array) {
    if (isWritten(element)) result.push_back(valueAfterWriting(element));
  }
  return {std::move(result)};
}

}  // namespace

bool isTooLargeToWrite(const PropertyListValue& value) {
  constexpr std::size_t kLimit = std::size_t{1} << 18;
  return sizeOf(value, kLimit) > kLimit;
}

bool areSame(const PropertyListValue& left, const PropertyListValue& right) {
  if (left.storage().index() != right.storage().index()) return false;
  if (const auto* number = std::get_if<double>(&left.storage())) {
    return (std::isnan(*number) && std::isnan(std::get<double>(right.storage()))) || left == right;
  }
  if (const Array* array = left.asArray()) {
    return std::equal(array->begin(), array->end(), right.asArray()->begin(),
                      right.asArray()->end(), areSame);
  }
  const Dictionary* dictionary = left.asDictionary();
  if (dictionary == nullptr) return left == right;
  const Dictionary& other = *right.asDictionary();
  return std::equal(dictionary->begin(), dictionary->end(), other.begin(), other.end(),
                    [](const auto& one, const auto& two) {
                      return one.first == two.first && areSame(one.second, two.second);
                    });
}

std::string xmlText(std::string_view text) {
  constexpr std::size_t kLongestCharacter = 4;
  std::string kept;
  while (!text.empty()) {
    std::size_t length = 1;
    while (length <= kLongestCharacter && !platform::isXMLText(text.substr(0, length))) ++length;
    const bool isKept = length <= kLongestCharacter;
    if (isKept) kept += text.substr(0, length);
    text.remove_prefix(std::min(isKept ? length : 1, text.size()));
  }
  return kept;
}

Dictionary afterWriting(const Dictionary& dictionary) {
  Dictionary result;
  for (const auto& [key, value] : dictionary) {
    // Keys can become the same; the last one then counts.
    if (isWritten(value)) result.insert_or_assign(xmlText(key), valueAfterWriting(value));
  }
  return result;
}

std::string written(const Dictionary& dictionary) {
  std::string bytes;
  const bool isTaken = platform::writePropertyList(dictionary, [&bytes](std::string_view piece) {
    bytes += piece;
    return true;
  });
  requireThat(isTaken, "a list is written when its bytes are taken");
  return bytes;
}

Dictionary writtenAndReadBack(const Dictionary& dictionary) {
  const std::string bytes = written(dictionary);
  std::optional<platform::PropertyListFault> fault;
  const auto value = platform::readPropertyList(bytes, fault);
  requireThat(value && value->asDictionary() != nullptr, "a written list is accepted");
  const Dictionary& result = *value->asDictionary();
  requireThat(areSame(result, afterWriting(dictionary)), "a written list reads back the same");
  return result;
}
