#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "platform/text/ErrorRecord.h"

/// The domain of every error record that the tool itself makes; records of platform services keep
/// their own.
inline constexpr std::string_view kQELErrorDomain = "QELDomain";

/// A new error record of the tool's own. Codes: 1 wrong use or missing input, 2 output could not be
/// produced, 3 a feed could not be fetched or understood.
platform::ErrorRecord QELError(std::int64_t code, std::string description);
