#include "platform/plist/PropertyListDictionary.h"

#include <algorithm>
#include <iterator>
#include <utility>

#include "platform/plist/PropertyListValue.h"

namespace platform {
namespace {

using Entry = PropertyListDictionary::Entry;

bool comesBefore(const Entry& left, const Entry& right) {
  return left.first.view() < right.first.view();
}

/// The first entry whose key is not less, of entries in order.
template <typename Entries>
auto place(Entries& entries, std::string_view key) {
  const bool isBehindAll = entries.empty() || entries.back().first.view() < key;
  if (isBehindAll) return entries.end();
  return std::lower_bound(
      entries.begin(), entries.end(), key,
      [](const Entry& entry, std::string_view wanted) { return entry.first.view() < wanted; });
}

void sortKeepingLast(PropertyListDictionary::Entries& entries) {
  const auto isInOrder = [&entries] {
    return std::adjacent_find(entries.begin(), entries.end(),
                              [](const Entry& left, const Entry& right) {
                                return !comesBefore(left, right);
                              }) == entries.end();
  };
  if (isInOrder()) return;
  std::stable_sort(entries.begin(), entries.end(), comesBefore);
  // Run backwards, std::unique keeps the last of equal keys.
  const auto kept =
      std::unique(entries.rbegin(), entries.rend(),
                  [](const Entry& left, const Entry& right) { return left.first == right.first; });
  entries.erase(entries.begin(), kept.base());
}

}  // namespace

PropertyListDictionary::PropertyListDictionary() = default;

PropertyListDictionary::PropertyListDictionary(std::initializer_list<Entry> entries)
    : PropertyListDictionary(Entries(entries)) {}

PropertyListDictionary::PropertyListDictionary(Entries entries) : entries_(std::move(entries)) {
  sortKeepingLast(entries_);
}

PropertyListDictionary::~PropertyListDictionary() = default;
PropertyListDictionary::PropertyListDictionary(const PropertyListDictionary&) = default;
PropertyListDictionary& PropertyListDictionary::operator=(const PropertyListDictionary&) = default;
PropertyListDictionary::PropertyListDictionary(PropertyListDictionary&&) noexcept = default;
PropertyListDictionary& PropertyListDictionary::operator=(PropertyListDictionary&&) noexcept =
    default;

void PropertyListDictionary::reserve(std::size_t count) {
  entries_.reserve(count);
}

void PropertyListDictionary::shrink_to_fit() {
  entries_.shrink_to_fit();
}

std::size_t PropertyListDictionary::size() const {
  return entries_.size();
}

PropertyListDictionary::const_iterator PropertyListDictionary::begin() const {
  return entries_.data();
}

PropertyListDictionary::const_iterator PropertyListDictionary::end() const {
  return entries_.data() + entries_.size();
}

PropertyListDictionary::const_iterator PropertyListDictionary::find(std::string_view key) const {
  // Among few entries most are told apart by the length of their keys, which is quicker than order.
  constexpr std::size_t kFew = 16;
  if (size() <= kFew) {
    return std::find_if(begin(), end(), [key](const Entry& entry) { return entry.first == key; });
  }
  const auto found = place(entries_, key);
  const bool isThere = found != entries_.end() && found->first == key;
  return isThere ? begin() + (found - entries_.begin()) : end();
}

void PropertyListDictionary::emplace(Text key, PropertyListValue value) {
  const auto found = place(entries_, key);
  if (found != entries_.end() && found->first == key) return;
  entries_.insert(found, {std::move(key), std::move(value)});
}

void PropertyListDictionary::insert_or_assign(Text key, PropertyListValue value) {
  const auto found = place(entries_, key);
  if (found != entries_.end() && found->first == key) {
    found->second = std::move(value);
  } else {
    entries_.insert(found, {std::move(key), std::move(value)});
  }
}

void PropertyListDictionary::erase(std::string_view key) {
  const auto found = place(entries_, key);
  if (found != entries_.end() && found->first == key) entries_.erase(found);
}

bool operator==(const PropertyListDictionary& left, const PropertyListDictionary& right) {
  return left.entries_ == right.entries_;
}

}  // namespace platform
