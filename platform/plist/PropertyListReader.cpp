#include "platform/plist/PropertyListReader.h"

#include <utility>

#include "platform/plist/BinaryPropertyListReader.h"
#include "platform/plist/XMLPropertyListReader.h"

namespace platform {

std::optional<PropertyListValue> readPropertyList(std::string bytes,
                                                  std::optional<PropertyListFault>& fault) {
  if (bytes.empty()) {
    fault = PropertyListFault{.description = "an empty property list"};
    return std::nullopt;
  }
  if (bytes.starts_with("bplist")) return readBinaryPropertyList(bytes, fault);
  return readXMLPropertyList(std::move(bytes), fault);
}

}  // namespace platform
