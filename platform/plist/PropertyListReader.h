#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>

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
std::optional<PropertyListValue> readPropertyList(ByteSource bytes,
                                                  std::optional<PropertyListFault>& fault);

}  // namespace platform
