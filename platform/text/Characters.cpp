#include "platform/text/Characters.h"

#include <unicode/utf8.h>

namespace platform {

std::int32_t nextNonASCIICharacter(std::string_view text, std::size_t& position) {
  const char* bytes = text.data();
  UChar32 character = 0;
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wconversion"  // within the macro
  U8_NEXT(bytes, position, text.size(), character);
#pragma GCC diagnostic pop
  return character;
}

bool isUTF8(std::string_view text) {
  for (std::size_t position = 0; position < text.size();) {
    if (nextCharacter(text, position) < 0) return false;
  }
  return true;
}

std::size_t characterCount(std::string_view text) {
  std::size_t count = 0;
  for (std::size_t position = 0; position < text.size(); ++count) nextCharacter(text, position);
  return count;
}

std::string_view firstCharacters(std::string_view text, std::size_t count) {
  std::size_t position = 0;
  for (; count > 0 && position < text.size(); --count) nextCharacter(text, position);
  return text.substr(0, position);
}

std::size_t utf16Length(std::string_view text) {
  std::size_t length = 0;
  for (std::size_t position = 0; position < text.size();) {
    length += nextCharacter(text, position) > 0xFFFF ? 2 : 1;
  }
  return length;
}

std::string withoutControls(std::string_view text) {
  std::string result;
  for (std::size_t position = 0; position < text.size();) {
    const std::size_t start = position;
    const std::int32_t character = nextCharacter(text, position);
    const bool isControl = character < 0x20 || (character >= 0x7F && character <= 0x9F);
    result.append(isControl ? "\uFFFD" : text.substr(start, position - start));
  }
  return result;
}

bool isHorizontalWhitespace(std::int32_t character) {
  constexpr std::u32string_view kOthers = U"\t \u00A0\u1680\u202F\u205F\u3000";
  return (character >= 0x2000 && character <= 0x200A) ||
         kOthers.find(static_cast<char32_t>(character)) != std::u32string_view::npos;
}

}  // namespace platform
