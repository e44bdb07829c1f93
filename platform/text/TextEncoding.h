#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace platform {

/// The bytes converted to UTF-8 from the named encoding (an IANA or other name that ICU knows).
/// Malformed input becomes U+FFFD. Absent when the encoding is not known.
std::optional<std::string> convertedToUTF8(std::string_view bytes, std::string_view encoding);

/// The one name of an encoding that all its aliases lead to ("ISO-8859-1" for "latin1"). Absent
/// when the encoding is not known.
std::optional<std::string> canonicalEncodingName(std::string_view encoding);

}  // namespace platform
