#pragma once

#include <optional>
#include <string_view>

#include "platform/ErrorRecord.h"
#include "platform/PropertyListValue.h"

namespace platform {

/// The deepest nesting of arrays and dictionaries that is read.
inline constexpr int kPropertyListDepthLimit = 512;

/// Reads a property list in its XML form (the DTD "PropertyList 1.0", any encoding) or its binary
/// form ("bplist00").
///
/// A list that is cut, malformed, cyclic or nested deeper than the limit gives no value and fills
/// the slot; for the XML form the description names the line and the column. Characters of a binary
/// text that are no Unicode (lone surrogates, bytes over 127 in ASCII) become U+FFFD.
std::optional<PropertyListValue> readPropertyList(std::string_view bytes, ErrorSlot& error);

}  // namespace platform
