#pragma once

#include <optional>

#include "platform/plist/PropertyListReader.h"

namespace platform {

/// Reads the XML form of a property list, for readPropertyList; without a value, with the fault.
std::optional<PropertyListValue> readXMLPropertyList(ByteSource bytes,
                                                     std::optional<PropertyListFault>& fault,
                                                     PropertyListPlaces* places = nullptr);

}  // namespace platform
