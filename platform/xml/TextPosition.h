#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace platform {

/// A place in a text. Both numbers count from 1, the column in characters; a line ends with a line
/// feed, a carriage return, or both together.
struct TextPosition {
  std::size_t line = 1;
  std::size_t column = 1;

  /// "line 3, column 7"
  std::string text() const;

  friend bool operator==(const TextPosition&, const TextPosition&) = default;
};

/// The place behind these characters.
TextPosition positionBehind(std::string_view text);

}  // namespace platform
