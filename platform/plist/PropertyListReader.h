#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "platform/plist/PropertyListValue.h"
#include "platform/text/ErrorRecord.h"

namespace platform {

/// The deepest nesting of arrays and dictionaries that is read.
inline constexpr int kPropertyListDepthLimit = 512;

/// The domain of the reader's error records; their codes are those of PropertyListFault.
inline constexpr std::string_view kPropertyListErrorDomain = "PropertyList";

enum class PropertyListFault : std::int64_t {
  kMalformed = 1,    // no property list, a cut one, or one that breaks the rules of its form
  kTooLarge = 2,     // nested too deeply, or grown too large by objects that are shared
  kOutOfMemory = 3,  // there is not enough memory for the values
};

/// Reads a property list in its XML form (the DTD "PropertyList 1.0", any encoding) or its binary
/// form ("bplist00").
///
/// A list that is cut, malformed, cyclic or nested deeper than the limit gives no value and fills
/// the slot; for the XML form the description names the line and the column, and a document that is
/// no XML at all gives the record of the XML parser. Characters of a binary text that are no
/// Unicode (lone surrogates, bytes over 127 in ASCII) become U+FFFD. Where a dictionary has a key
/// twice, the last one counts. The binary form's null, fill and UID objects have no place in a
/// property list and are refused; a set is read as an array.
std::optional<PropertyListValue> readPropertyList(std::string bytes, ErrorSlot& error);

}  // namespace platform
