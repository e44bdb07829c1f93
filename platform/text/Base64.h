#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace platform {

/// Appends the bytes in base64 (RFC 4648, with padding) to `output`, without line breaks.
void appendBase64(std::string& output, std::string_view bytes);

/// The bytes that the base64 text stands for. White space is ignored wherever it stands; absent for
/// any other character outside the alphabet and for wrong or missing padding.
std::optional<std::string> bytesFromBase64(std::string_view text);

}  // namespace platform
