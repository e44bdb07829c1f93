#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/plist/PropertyListReader.h"

namespace platform {

/// A value of a property list that was read with its places, and where it stands: in the XML form
/// by line and column, in the binary one by its keys. The list and its places outlive it.
///
///     const PropertyListPart root{.value = &list, .places = &places};
///     for (const PropertyListPart& entry : root.parts()) show(entry.key, entry.keyPosition());
struct PropertyListPart {
  const PropertyListValue* value = nullptr;
  const PropertyListPlaces* places = nullptr;  // empty for the binary form
  std::size_t index = 0;                       // among the places
  Text key = {};                               // empty for an element of an array
  std::string path = {};  // in the binary form: "Episodes[2].EpisodeDate", counted from 1

  /// The entries of a dictionary or the elements of an array, as the document has them; empty for
  /// any other value. A key that stands there twice has two entries, both with the last one's
  /// value; the parts of the last one alone are asked for.
  std::vector<PropertyListPart> parts() const;

  /// Absent in the binary form.
  std::optional<TextPosition> keyPosition() const;
  std::optional<TextPosition> position() const;

  /// "a text", "an integer", "a number with a fraction", "a truth value", "a date", "data", "an
  /// array" or "a dictionary".
  std::string_view kind() const;
  /// Of a text.
  std::string_view text() const;
};

}  // namespace platform
