#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

#include "platform/text/ASCII.h"

namespace platform {

/// Characters here are Unicode code points of UTF-8; a malformed sequence counts as one.

/// The part of nextCharacter that few texts need.
std::int32_t nextNonASCIICharacter(std::string_view text, std::size_t& position);

/// Takes the character at `position`, which is inside the text, and moves behind it. Negative for a
/// malformed sequence, of which as much is passed over as one replacement character stands for.
inline std::int32_t nextCharacter(std::string_view text, std::size_t& position) {
  return isASCII(text[position]) ? text[position++] : nextNonASCIICharacter(text, position);
}

/// Whether the text holds no malformed sequence.
bool isUTF8(std::string_view text);

std::size_t characterCount(std::string_view text);

/// The first `count` characters, or all of a shorter text.
std::string_view firstCharacters(std::string_view text, std::size_t count);

/// The number of 16-bit units that the text takes in UTF-16.
std::size_t utf16Length(std::string_view text);

/// The text with U+FFFD in the place of each control character (C0, DEL, C1) and of each malformed
/// sequence, in which some terminals would find one.
std::string withoutControls(std::string_view text);

/// Whether the character is horizontal white space: a tab or one of Unicode's space separators
/// (Zs).
bool isHorizontalWhitespace(std::int32_t character);

}  // namespace platform
