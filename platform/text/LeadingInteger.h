#pragma once

#include <cstdint>
#include <string_view>

namespace platform {

/// The decimal integer at the start of the text: leading white space (line breaks included), one
/// sign and digits, up to the first other character ("05," gives 5). 0 without digits; the nearest
/// 64-bit number where the digits exceed it.
std::int64_t leadingInteger(std::string_view text);

}  // namespace platform
