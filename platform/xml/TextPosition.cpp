#include "platform/xml/TextPosition.h"

namespace platform {

std::string TextPosition::text() const {
  return "line " + std::to_string(line) + ", column " + std::to_string(column);
}

TextPosition positionBehind(std::string_view text) {
  TextPosition position;
  char previous = '\0';
  for (const char character : text) {
    const bool endsLine = character == '\n' || character == '\r';
    if (endsLine && !(character == '\n' && previous == '\r')) {
      ++position.line;
      position.column = 1;
    } else if (!endsLine && (static_cast<unsigned char>(character) & 0xC0U) != 0x80U) {
      ++position.column;
    }
    previous = character;
  }
  return position;
}

}  // namespace platform
