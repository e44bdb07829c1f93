#pragma once

#include <cstddef>
#include <initializer_list>
#include <string_view>
#include <vector>

#include "platform/text/Text.h"

namespace platform {

class PropertyListValue;

/// The values of a property list's dictionary by their keys, in the order in which they are
/// written: that of the keys' bytes. It is used as the standard's maps are.
///
/// The entries lie side by side, since a podcast has tens of thousands of dictionaries with a dozen
/// keys each: a node for each entry would take most of the time and of the memory. So a key is
/// added at once behind all others, and otherwise at the cost of moving those behind it; many
/// entries in any order are given to the constructor together.
class PropertyListDictionary {
 public:
  /// A key, `first`, and its value, `second`; see PropertyListValue.h.
  struct Entry;
  using Entries = std::vector<Entry>;
  using const_iterator = const Entry*;

  PropertyListDictionary();
  PropertyListDictionary(std::initializer_list<Entry> entries);
  /// Of entries in any order. Where a key stands twice, the last one counts.
  explicit PropertyListDictionary(Entries entries);
  ~PropertyListDictionary();
  PropertyListDictionary(const PropertyListDictionary&);
  PropertyListDictionary& operator=(const PropertyListDictionary&);
  PropertyListDictionary(PropertyListDictionary&&) noexcept;
  PropertyListDictionary& operator=(PropertyListDictionary&&) noexcept;

  /// Makes room for that many entries.
  void reserve(std::size_t count);
  /// Gives back the room that no entry takes.
  void shrink_to_fit();
  std::size_t size() const;
  bool empty() const { return size() == 0; }
  const_iterator begin() const;
  const_iterator end() const;

  /// The entry of the key, or end().
  const_iterator find(std::string_view key) const;

  /// Adds the entry unless the key is there already.
  void emplace(Text key, PropertyListValue value);
  /// Adds the entry, or gives the key that is there the new value.
  void insert_or_assign(Text key, PropertyListValue value);
  void erase(std::string_view key);

  friend bool operator==(const PropertyListDictionary& left, const PropertyListDictionary& right);

 private:
  Entries entries_;  // sorted, each key once
};

}  // namespace platform
