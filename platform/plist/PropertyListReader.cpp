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
  if (bytes.starts_with("bplist")) return BinaryPropertyListReader(bytes).read(fault);
  return XMLPropertyListReader(std::move(bytes)).read(fault);
}

}  // namespace platform
