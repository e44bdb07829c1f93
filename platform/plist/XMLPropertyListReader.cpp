#include "platform/plist/XMLPropertyListReader.h"

#include <array>
#include <charconv>
#include <cstdint>
#include <limits>
#include <system_error>
#include <utility>

#include "platform/plist/PropertyListDate.h"
#include "platform/text/ASCII.h"
#include "platform/text/Base64.h"
#include "platform/text/FormattedText.h"

namespace platform {
namespace {

/// The number that the whole text is; absent for anything else and for one out of range.
template <typename Number, typename... Format>
std::optional<Number> wholeNumber(std::string_view text, Format... format) {
  Number number{};
  const char* const end = text.data() + text.size();
  const auto result = std::from_chars(text.data(), end, number, format...);
  if (result.ec != std::errc() || result.ptr != end) return std::nullopt;
  return number;
}

bool startsWithSign(std::string_view text) {
  return text.starts_with('-') || text.starts_with('+');
}

std::optional<PropertyListValue> integerFromText(std::string_view text) {
  const bool isNegative = text.starts_with('-');
  if (startsWithSign(text)) text.remove_prefix(1);
  const bool isHexadecimal = text.starts_with("0x") || text.starts_with("0X");
  if (isHexadecimal) text.remove_prefix(2);

  const auto magnitude = wholeNumber<std::uint64_t>(text, isHexadecimal ? 16 : 10);
  if (!magnitude) return std::nullopt;
  if (!isNegative) return PropertyListValue(*magnitude);
  constexpr std::uint64_t kLargest = std::uint64_t{1} << 63;
  if (*magnitude > kLargest) return std::nullopt;
  return PropertyListValue(static_cast<std::int64_t>(0 - *magnitude));
}

std::optional<double> realFromText(std::string_view text) {
  if (text.starts_with('+')) {
    text.remove_prefix(1);
    if (startsWithSign(text)) return std::nullopt;
  }
  return wholeNumber<double>(text);
}

std::optional<PropertyListValue> dataFromText(std::string_view text) {
  auto bytes = bytesFromBase64(text);
  if (!bytes) return std::nullopt;
  return PropertyListValue(PropertyListValue::Data{std::move(*bytes)});
}

}  // namespace

enum class XMLPropertyListReader::Element {
  kPlist,
  kArray,
  kDict,
  kKey,
  kString,
  kInteger,
  kReal,
  kTrue,
  kFalse,
  kDate,
  kData
};

std::optional<XMLPropertyListReader::Element> XMLPropertyListReader::elementNamed(
    std::string_view name) {
  static constexpr std::array<std::pair<std::string_view, Element>, 11> kElements = {{
      {"key", Element::kKey},
      {"string", Element::kString},
      {"integer", Element::kInteger},
      {"date", Element::kDate},
      {"dict", Element::kDict},
      {"array", Element::kArray},
      {"real", Element::kReal},
      {"true", Element::kTrue},
      {"false", Element::kFalse},
      {"data", Element::kData},
      {"plist", Element::kPlist},
  }};
  for (const auto& [elementName, element] : kElements) {
    if (elementName == name) return element;
  }
  return std::nullopt;
}

std::optional<PropertyListValue> XMLPropertyListReader::read(
    std::optional<PropertyListFault>& fault) {
  std::optional<XMLFault> found;
  if (parser_.parse(found)) return builder_.takeRoot();
  fault =
      PropertyListFault{.description = std::move(found->description), .position = found->position};
  return std::nullopt;
}

void XMLPropertyListReader::didStartElement(const XMLName& name,
                                            const XMLAttributes& /*attributes*/) {
  const auto element = elementNamed(name.qualified);
  const bool isList = element == Element::kPlist;
  if (!isInsideList_ && !isList) {
    parser_.abort("a document whose root element is not \"plist\"");
  } else if (!isInsideList_) {
    isInsideList_ = true;
  } else if (!element || isList) {
    parser_.abort(formattedText("an unexpected element \"%@\"", {name.qualified}));
  } else if (scalar_) {
    parser_.abort(
        formattedText("an element \"%@\" inside of a value that holds text", {name.qualified}));
  } else if (element == Element::kKey) {
    startKey();
  } else {
    startValue(*element);
  }
}

void XMLPropertyListReader::didEndElement(const XMLName& /*name*/) {
  if (scalar_) {
    endScalar();
  } else if (builder_.depth() > 0) {
    endContainer();
  } else if (!builder_.hasRoot()) {
    parser_.abort("a property list without a value");
  }
}

void XMLPropertyListReader::foundCharacters(std::string_view text) {
  const bool holdsText = scalar_ && scalar_ != Element::kTrue && scalar_ != Element::kFalse;
  if (holdsText) {
    text_ += text;
  } else if (!trimmed(text).empty()) {
    parser_.abort("text outside of a value that holds text");
  }
}

void XMLPropertyListReader::startKey() {
  if (!builder_.isInDictionary()) {
    parser_.abort("a key outside of a dictionary");
  } else if (builder_.hasPendingKey()) {
    parser_.abort("a key without a value in a dictionary");
  } else {
    startScalar(Element::kKey);
  }
}

void XMLPropertyListReader::startValue(Element element) {
  const bool isContainer = element == Element::kArray || element == Element::kDict;
  if (builder_.hasRoot()) {
    parser_.abort("a second value in a property list");
  } else if (builder_.isInDictionary() && !builder_.hasPendingKey()) {
    parser_.abort("a value without a key in a dictionary");
  } else if (!isContainer) {
    startScalar(element);
  } else if (builder_.depth() == kPropertyListDepthLimit) {
    parser_.abort(kPropertyListTooDeep);
  } else if (element == Element::kArray) {
    builder_.beginArray();
  } else {
    builder_.beginDictionary();
  }
}

void XMLPropertyListReader::startScalar(Element element) {
  scalar_ = element;
  text_.clear();
}

void XMLPropertyListReader::endContainer() {
  if (builder_.hasPendingKey()) {
    parser_.abort("a key without a value in a dictionary");
  } else {
    builder_.end();
  }
}

void XMLPropertyListReader::endScalar() {
  switch (*std::exchange(scalar_, std::nullopt)) {
    case Element::kKey:
      builder_.setKey(text_);
      break;
    case Element::kString:
      builder_.add(Text(std::string_view(text_)));
      break;
    case Element::kInteger:
      addUnlessAbsent(integerFromText(trimmed(text_)), "an integer that is none or out of range");
      break;
    case Element::kReal:
      addUnlessAbsent(realFromText(trimmed(text_)), "a real that is none or out of range");
      break;
    case Element::kDate:
      addUnlessAbsent(dateFromPropertyListText(trimmed(text_)),
                      "a date that is none or out of range");
      break;
    case Element::kData:
      addUnlessAbsent(dataFromText(text_), "data that is not in base64");
      break;
    case Element::kTrue:
      builder_.add(true);
      break;
    default:
      builder_.add(false);
      break;
  }
}

template <typename Value>
void XMLPropertyListReader::addUnlessAbsent(std::optional<Value> value,
                                            std::string_view faultIfAbsent) {
  if (value) {
    builder_.add(std::move(*value));
  } else {
    parser_.abort(std::string(faultIfAbsent));
  }
}

}  // namespace platform
