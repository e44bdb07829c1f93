#include "platform/plist/PropertyListReader.h"

#include <utility>

#include "platform/plist/BinaryPropertyListReader.h"
#include "platform/plist/XMLPropertyListReader.h"

namespace platform {

std::optional<PropertyListValue> readPropertyList(ByteSource bytes,
                                                  std::optional<PropertyListFault>& fault,
                                                  PropertyListPlaces* places) {
  ErrorSlot error;
  const std::string_view head = bytes.head(error);
  if (head.starts_with("bplist")) {
    const std::optional<std::string> all = bytes.readAll(error);
    if (all) return readBinaryPropertyList(*all, fault);
  } else if (!head.empty()) {
    return readXMLPropertyList(std::move(bytes), fault, places);
  }
  fault = PropertyListFault{.description = error ? error->description : "an empty property list"};
  return std::nullopt;
}

}  // namespace platform
