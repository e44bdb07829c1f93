#pragma once

#include <cstdint>
#include <string>
#include <utility>

#include "platform/text/ErrorRecord.h"

/// A new error record of the tool's own, in the domain "QELDomain"; records of platform services
/// keep their own domains. Codes: 1 wrong use or missing input, 2 output could not be produced, 3 a
/// feed could not be fetched or understood.
inline platform::ErrorRecord QELError(std::int64_t code, std::string description) {
  return {"QELDomain", code, std::move(description)};
}
