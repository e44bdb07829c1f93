#pragma once

#include <cstddef>
#include <string_view>
#include <vector>

namespace platform {

/// The pieces between the separators: one more than there are separators, empty ones included. The
/// views point into `text`. The last of `most` pieces (at least 1) holds the rest unsplit, so that
/// who expects few pieces need not hold the millions of a hostile text.
std::vector<std::string_view> splitAt(std::string_view text, char separator,
                                      std::size_t most = std::string_view::npos);

/// The same, at every horizontal white-space character (see Characters.h). Line breaks do not
/// separate. Every single white-space character separates, so two in a row enclose an empty piece.
std::vector<std::string_view> splitAtWhitespace(std::string_view text,
                                                std::size_t most = std::string_view::npos);

}  // namespace platform
