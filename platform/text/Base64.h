#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace platform {

/// The bytes that the base64 text (RFC 4648) stands for. White space is ignored wherever it stands;
/// absent for any other character outside the alphabet and for wrong or missing padding.
std::optional<std::string> bytesFromBase64(std::string_view text);

}  // namespace platform
