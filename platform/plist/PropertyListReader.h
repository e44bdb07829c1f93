#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "platform/plist/PropertyListValue.h"
#include "platform/text/ByteSource.h"
#include "platform/xml/TextPosition.h"

namespace platform {

/// The deepest nesting of arrays and dictionaries that is read.
inline constexpr std::size_t kPropertyListDepthLimit = 512;
inline constexpr const char* kPropertyListTooDeep =
    "arrays and dictionaries nested deeper than 512 levels";

/// What is wrong with a property list, and where; without a place it is the list as a whole.
struct PropertyListFault {
  std::string description;  // "a key without a value in a dictionary"
  /// In the XML form.
  std::optional<TextPosition> position = std::nullopt;
  /// In the binary form: the number of the object.
  std::optional<std::uint64_t> object = std::nullopt;
};

/// Where a value of a property list stands in its XML form, and its key where it has one.
struct PropertyListPlace {
  Text key = {};                  // empty in an array
  TextPosition keyPosition = {};  // that of the value, in an array
  TextPosition position = {};     // of the value
  std::size_t end = 0;            // the index behind the last of the values inside of this one
};

/// The places of all values in document order, a container's own before those of its values. A
/// value that is not in the list, since its key stands there again, has its place all the same.
using PropertyListPlaces = std::vector<PropertyListPlace>;

/// Reads a property list in its XML form (the DTD "PropertyList 1.0", any encoding) or its binary
/// form ("bplist00"):
///
///   std::optional<PropertyListFault> fault;
///   const std::optional<PropertyListValue> list = readPropertyList(std::move(bytes), fault);
///   if (!list) show(fault->description);
///
/// A list that is cut, malformed, cyclic, nested deeper than the limit, or grown too large by
/// objects that are shared, gives no value and its first fault. Characters of a binary text that
/// are no Unicode (lone surrogates, bytes over 127 in ASCII) become U+FFFD. Where a dictionary has
/// a key twice, the last one counts. The binary form's null, fill and UID objects have no place in
/// a property list and are refused; a set is read as an array.
///
/// With `places`, which is empty, those of the XML form are recorded, and a fault of a value stands
/// at that value and not at its end; what a binary list has stands nowhere.
std::optional<PropertyListValue> readPropertyList(ByteSource bytes,
                                                  std::optional<PropertyListFault>& fault,
                                                  PropertyListPlaces* places = nullptr);

}  // namespace platform
