#pragma once

#include <optional>
#include <string_view>

#include "platform/plist/PropertyListReader.h"

namespace platform {

/// Reads the binary form of a property list, for readPropertyList; without a value, with the fault.
///
/// The form is a header, objects, a table of the objects' offsets, and a trailer that tells where
/// the table lies. An array or a dictionary names its parts by their numbers in the table, so any
/// number of containers can share an object. Nothing of this is believed: every offset, count and
/// size is checked before it is used.
std::optional<PropertyListValue> readBinaryPropertyList(std::string_view bytes,
                                                        std::optional<PropertyListFault>& fault);

}  // namespace platform
