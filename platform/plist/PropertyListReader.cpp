#include "platform/plist/PropertyListReader.h"

#include <new>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>

#include "platform/plist/BinaryPropertyListReader.h"
#include "platform/plist/XMLPropertyListReader.h"

namespace platform {

namespace {

constexpr std::string_view kBinaryMark = "bplist";

ErrorRecord recordOf(PropertyListFault fault, std::string description) {
  return {.domain = std::string(kPropertyListErrorDomain),
          .code = static_cast<std::int64_t>(fault),
          .description = std::move(description)};
}

}  // namespace

std::optional<PropertyListValue> readPropertyList(std::string bytes, ErrorSlot& error) {
  if (bytes.empty()) {
    error = recordOf(PropertyListFault::kMalformed, "an empty property list");
    return std::nullopt;
  }
  try {
    if (bytes.starts_with(kBinaryMark)) return BinaryPropertyListReader(bytes).read(error);
    return XMLPropertyListReader(std::move(bytes)).read(error);
  } catch (const std::bad_alloc&) {
    error = recordOf(PropertyListFault::kOutOfMemory, "out of memory");
  } catch (const std::length_error&) {
    error = recordOf(PropertyListFault::kOutOfMemory, "out of memory");
  }
  return std::nullopt;
}

}  // namespace platform
