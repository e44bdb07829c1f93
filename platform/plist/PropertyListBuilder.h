#pragma once

#include <cstddef>
#include <optional>
#include <utility>
#include <variant>
#include <vector>

#include "platform/plist/PropertyListValue.h"

namespace platform {

/// Puts a property list together from its values in document order; what both forms' readers share.
///
/// Open containers stand on a stack of the builder's own, so that no nesting can exhaust the stack
/// of the thread. The caller keeps to the order that the functions ask for.
class PropertyListBuilder {
 public:
  /// Adds the value to the innermost open container, or makes it the root when none is open. In a
  /// dictionary its key has been set. A key that the dictionary has already gets the new value.
  void add(PropertyListValue value);

  /// Opens a container inside the innermost one; it is added to that one when it ends.
  void beginArray(std::size_t expectedCount = 0);
  void beginDictionary(std::size_t expectedCount = 0);
  /// Ends the innermost open container.
  void end();

  /// Sets the key of the next value; the innermost open container is a dictionary.
  void setKey(Text key);

  /// The number of open containers.
  std::size_t depth() const { return levels_.size(); }
  bool isInDictionary() const;
  /// Whether a key was set in the innermost container whose value is still to come.
  bool hasPendingKey() const { return !levels_.empty() && levels_.back().key.has_value(); }

  bool hasRoot() const { return root_.has_value(); }
  /// Hands the root over; absent when there is none yet.
  std::optional<PropertyListValue> takeRoot() { return std::move(root_); }

 private:
  struct Level {
    std::variant<PropertyListValue::Array, PropertyListValue::Dictionary::Entries> container;
    std::optional<Text> key;
  };

  std::vector<Level> levels_;
  std::optional<PropertyListValue> root_;
};

}  // namespace platform
