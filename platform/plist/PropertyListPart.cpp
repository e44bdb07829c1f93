#include "platform/plist/PropertyListPart.h"

#include <array>
#include <utility>
#include <variant>

namespace platform {

std::vector<PropertyListPart> PropertyListPart::parts() const {
  std::vector<PropertyListPart> found;
  const Dictionary* dictionary = value->asDictionary();
  const PropertyListValue::Array* array = value->asArray();
  if (!places->empty()) {
    std::size_t number = 0;
    for (std::size_t next = index + 1; next < (*places)[index].end; next = (*places)[next].end) {
      const Text& name = (*places)[next].key;
      const auto* const part =
          dictionary != nullptr ? valueForKey(*dictionary, name) : &(*array)[number++];
      found.push_back({part, places, next, name});
    }
  } else if (dictionary != nullptr) {
    const std::string before = path.empty() ? path : path + ".";
    for (const auto& [name, part] : *dictionary) {
      found.push_back({&part, places, 0, name, before + name.string()});
    }
  } else if (array != nullptr) {
    for (const PropertyListValue& part : *array) {
      std::string number = std::to_string(found.size() + 1);
      found.push_back({&part, places, 0, {}, path + '[' + std::move(number) + ']'});
    }
  }
  return found;
}

std::optional<TextPosition> PropertyListPart::keyPosition() const {
  if (places->empty()) return std::nullopt;
  return (*places)[index].keyPosition;
}

std::optional<TextPosition> PropertyListPart::position() const {
  if (places->empty()) return std::nullopt;
  return (*places)[index].position;
}

std::string_view PropertyListPart::kind() const {
  using Storage = PropertyListValue::Storage;
  constexpr std::array<std::string_view, std::variant_size_v<Storage>> kKinds = {
      "a text", "an integer", "an integer",  "a number with a fraction", "a truth value", "a date",
      "data",   "an array",   "a dictionary"};
  return kKinds[value->storage().index()];
}

std::string_view PropertyListPart::text() const {
  return std::get<Text>(value->storage());
}

}  // namespace platform
