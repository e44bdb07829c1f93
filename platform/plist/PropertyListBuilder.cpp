#include "platform/plist/PropertyListBuilder.h"

#include <utility>

namespace platform {

void PropertyListBuilder::add(PropertyListValue value) {
  if (levels_.empty()) {
    root_ = std::move(value);
    return;
  }
  Level& level = levels_.back();
  if (auto* array = std::get_if<PropertyListValue::Array>(&level.container)) {
    array->push_back(std::move(value));
    return;
  }
  std::get<Dictionary::Entries>(level.container)
      .push_back({*std::exchange(level.key, std::nullopt), std::move(value)});
}

void PropertyListBuilder::beginArray(std::size_t expectedCount) {
  levels_.emplace_back().container.emplace<PropertyListValue::Array>().reserve(expectedCount);
}

void PropertyListBuilder::beginDictionary(std::size_t expectedCount) {
  levels_.emplace_back().container.emplace<Dictionary::Entries>().reserve(expectedCount);
}

void PropertyListBuilder::end() {
  Level level = std::move(levels_.back());
  levels_.pop_back();
  if (auto* array = std::get_if<PropertyListValue::Array>(&level.container)) {
    add(std::move(*array));
  } else {
    add(Dictionary(std::move(std::get<Dictionary::Entries>(level.container))));
  }
}

void PropertyListBuilder::setKey(Text key) {
  levels_.back().key = std::move(key);
}

bool PropertyListBuilder::isInDictionary() const {
  return !levels_.empty() && std::holds_alternative<Dictionary::Entries>(levels_.back().container);
}

}  // namespace platform
