#include "platform/PropertyListBuilder.h"

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
  // Keys mostly come in sorted order, and each then goes to the end without a search.
  auto& dictionary = std::get<PropertyListValue::Dictionary>(level.container);
  dictionary.insert_or_assign(dictionary.end(), *std::exchange(level.key, std::nullopt),
                              std::move(value));
}

void PropertyListBuilder::beginArray(std::size_t expectedCount) {
  levels_.emplace_back().container.emplace<PropertyListValue::Array>().reserve(expectedCount);
}

void PropertyListBuilder::beginDictionary() {
  levels_.emplace_back().container.emplace<PropertyListValue::Dictionary>();
}

void PropertyListBuilder::end() {
  Level level = std::move(levels_.back());
  levels_.pop_back();
  std::visit([this](auto& container) { add(std::move(container)); }, level.container);
}

void PropertyListBuilder::setKey(std::string key) {
  levels_.back().key = std::move(key);
}

bool PropertyListBuilder::isInDictionary() const {
  return !levels_.empty() &&
         std::holds_alternative<PropertyListValue::Dictionary>(levels_.back().container);
}

}  // namespace platform
