#include "platform/plist/XMLPropertyListReader.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdint>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

#include "platform/plist/PropertyListBuilder.h"
#include "platform/plist/PropertyListDate.h"
#include "platform/text/ASCII.h"
#include "platform/text/Base64.h"
#include "platform/text/FormattedText.h"
#include "platform/xml/XMLParser.h"

namespace platform {
namespace {

using Value = std::optional<PropertyListValue>;

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

Value integerFromText(std::string_view text) {
  text = trimmed(text);
  const bool isNegative = text.starts_with('-');
  if (startsWithSign(text)) text.remove_prefix(1);
  const bool isHexadecimal = text.starts_with("0x") || text.starts_with("0X");
  if (isHexadecimal) text.remove_prefix(2);

  const auto magnitude = wholeNumber<std::uint64_t>(text, isHexadecimal ? 16 : 10);
  if (!magnitude) return std::nullopt;
  if (!isNegative) return *magnitude;
  constexpr std::uint64_t kLargest = std::uint64_t{1} << 63;
  if (*magnitude > kLargest) return std::nullopt;
  return static_cast<std::int64_t>(0 - *magnitude);
}

Value realFromText(std::string_view text) {
  text = trimmed(text);
  if (text.starts_with('+')) {
    text.remove_prefix(1);
    if (startsWithSign(text)) return std::nullopt;
  }
  return wholeNumber<double>(text);
}

Value dataFromText(std::string_view text) {
  auto bytes = bytesFromBase64(text);
  if (!bytes) return std::nullopt;
  return PropertyListValue::Data{std::move(*bytes)};
}

/// What an element of a property list is.
struct Element {
  enum class Kind { kList, kArray, kDictionary, kKey, kText, kFlag };

  std::string_view name;
  Kind kind;
  Value (*value)(std::string_view text) = nullptr;  // of a text or a flag
  const char* fault = nullptr;                      // of a text that gives no value
};
using Kind = Element::Kind;

constexpr auto kElements = std::to_array<Element>({
    {"key", Kind::kKey},
    {"string", Kind::kText, [](std::string_view text) -> Value { return Text(text); }},
    {"integer", Kind::kText, integerFromText, "an integer that is none or out of range"},
    {"date", Kind::kText,
     [](std::string_view text) -> Value { return dateFromPropertyListText(trimmed(text)); },
     "a date that is none or out of range"},
    {"dict", Kind::kDictionary},
    {"array", Kind::kArray},
    {"real", Kind::kText, realFromText, "a real that is none or out of range"},
    {"true", Kind::kFlag, [](std::string_view) -> Value { return true; }},
    {"false", Kind::kFlag, [](std::string_view) -> Value { return false; }},
    {"data", Kind::kText, dataFromText, "data that is not in base64"},
    {"plist", Kind::kList},
});

/// Reads one list.
class Reader final : private XMLParserEvents {
 public:
  Reader(ByteSource bytes, PropertyListPlaces* places)
      : parser_(std::move(bytes), *this), places_(places) {}

  Value read(std::optional<PropertyListFault>& fault) {
    std::optional<XMLFault> found;
    if (parser_.parse(found)) return builder_.takeRoot();
    fault = PropertyListFault{.description = std::move(found->description)};
    if (!found->reading) fault->position = faultyValue_.value_or(found->position);
    return std::nullopt;
  }

 private:
  void didStartElement(const XMLName& name, const XMLAttributes& /*attributes*/) override {
    const auto* const element =
        std::ranges::find(kElements, name.qualified, [](const Element& e) { return e.name; });
    const bool isKnown = element != kElements.end();
    const bool isList = isKnown && element->kind == Kind::kList;
    if (!isInsideList_ && !isList) {
      parser_.abort("a document whose root element is not \"plist\"");
    } else if (!isInsideList_) {
      isInsideList_ = true;
    } else if (!isKnown || isList) {
      parser_.abort(formattedText("an unexpected element \"%@\"", {name.qualified}));
    } else if (open_ != nullptr) {
      parser_.abort(
          formattedText("an element \"%@\" inside of a value that holds text", {name.qualified}));
    } else if (element->kind == Kind::kKey) {
      startKey(*element);
    } else {
      startValue(*element);
    }
  }

  void didEndElement(const XMLName& /*name*/) override {
    if (open_ != nullptr) {
      endText(*std::exchange(open_, nullptr));
    } else if (builder_.hasPendingKey()) {
      parser_.abort(kKeyWithoutValue);
    } else if (builder_.depth() > 0) {
      builder_.end();
      if (places_ != nullptr) endPlace();
    } else if (!builder_.hasRoot()) {
      parser_.abort("a property list without a value");
    }
  }

  void foundCharacters(std::string_view text) override {
    if (open_ != nullptr && open_->kind != Kind::kFlag) {
      text_ += text;
    } else if (!trimmed(text).empty()) {
      parser_.abort("text outside of a value that holds text");
    }
  }

  void startKey(const Element& element) {
    if (!builder_.isInDictionary()) {
      parser_.abort("a key outside of a dictionary");
    } else if (builder_.hasPendingKey()) {
      parser_.abort(kKeyWithoutValue);
    } else {
      if (places_ != nullptr) keyPosition_ = parser_.position();
      startText(element);
    }
  }

  void startValue(const Element& element) {
    const bool isArray = element.kind == Kind::kArray;
    parser_.count([this](MemoryBudget& budget) {
      return builder_.isInDictionary() ? budget.takeFields() : budget.takeRecords();
    });
    if (builder_.hasRoot()) {
      parser_.abort("a second value in a property list");
    } else if (builder_.isInDictionary() && !builder_.hasPendingKey()) {
      parser_.abort("a value without a key in a dictionary");
    } else {
      if (places_ != nullptr) beginPlace();
      startSoundValue(element, isArray);
    }
  }

  void startSoundValue(const Element& element, bool isArray) {
    if (!isArray && element.kind != Kind::kDictionary) {
      startText(element);
    } else if (builder_.depth() == kPropertyListDepthLimit) {
      parser_.abort(kPropertyListTooDeep);
    } else if (isArray) {
      builder_.beginArray();
    } else {
      builder_.beginDictionary();
    }
  }

  void startText(const Element& element) {
    open_ = &element;
    text_.clear();
  }

  void endText(const Element& element) {
    if (element.kind == Kind::kKey) {
      Text key(text_);
      if (places_ != nullptr) key_ = key;
      builder_.setKey(std::move(key));
    } else if (Value value = element.value(text_)) {
      parser_.count([this](MemoryBudget& budget) { return budget.takeWritten(text_); });
      builder_.add(std::move(*value));
      if (places_ != nullptr) endPlace();
    } else {
      if (places_ != nullptr) faultyValue_ = places_->back().position;
      parser_.abort(element.fault);
    }
  }

  void beginPlace() {
    const TextPosition position = parser_.position();
    openPlaces_.push_back(places_->size());
    const bool hasKey = builder_.isInDictionary();
    places_->push_back({hasKey ? key_ : Text(), hasKey ? keyPosition_ : position, position});
  }

  void endPlace() {
    (*places_)[openPlaces_.back()].end = places_->size();
    openPlaces_.pop_back();
  }

  static constexpr const char* kKeyWithoutValue = "a key without a value in a dictionary";

  XMLParser parser_;
  PropertyListBuilder builder_;
  bool isInsideList_ = false;
  const Element* open_ = nullptr;  // the open element that holds text, not elements
  std::string text_;               // what it holds so far

  PropertyListPlaces* places_;           // null when nobody asks for them
  std::vector<std::size_t> openPlaces_;  // the indices of those whose values have not ended
  Text key_;                             // the last one, and where it stands
  TextPosition keyPosition_;
  std::optional<TextPosition> faultyValue_;
};

}  // namespace

std::optional<PropertyListValue> readXMLPropertyList(ByteSource bytes,
                                                     std::optional<PropertyListFault>& fault,
                                                     PropertyListPlaces* places) {
  return Reader(std::move(bytes), places).read(fault);
}

}  // namespace platform
