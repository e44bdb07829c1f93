#include "platform/text/Splitting.h"

#include <algorithm>

#include "platform/text/Characters.h"

namespace platform {
namespace {

/// Room for all pieces where few are expected, as in each of the dates of a feed.
std::vector<std::string_view> roomForPieces(std::size_t most) {
  constexpr std::size_t kFew = 8;
  std::vector<std::string_view> pieces;
  pieces.reserve(std::min(most, kFew));
  return pieces;
}

}  // namespace

std::vector<std::string_view> splitAt(std::string_view text, char separator, std::size_t most) {
  std::vector<std::string_view> pieces = roomForPieces(most);
  while (pieces.size() + 1 < most) {
    const std::size_t found = text.find(separator);
    if (found == std::string_view::npos) break;
    pieces.push_back(text.substr(0, found));
    text.remove_prefix(found + 1);
  }
  pieces.push_back(text);
  return pieces;
}

std::vector<std::string_view> splitAtWhitespace(std::string_view text, std::size_t most) {
  std::vector<std::string_view> pieces = roomForPieces(most);
  std::size_t start = 0;
  for (std::size_t position = 0; position < text.size() && pieces.size() + 1 < most;) {
    const std::size_t characterStart = position;
    if (isHorizontalWhitespace(nextCharacter(text, position))) {
      pieces.push_back(text.substr(start, characterStart - start));
      start = position;
    }
  }
  pieces.push_back(text.substr(start));
  return pieces;
}

}  // namespace platform
