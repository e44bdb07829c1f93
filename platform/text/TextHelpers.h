#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace platform {

/// The text in lower (upper) case by Unicode's full, locale-independent case mapping. Bytes that
/// are no UTF-8 stay as they are.
std::string lowercased(std::string_view text);
std::string uppercased(std::string_view text);

/// The text with every occurrence of `target` (not empty) replaced, left to right.
std::string replacingAll(std::string_view text, std::string_view target,
                         std::string_view replacement);

/// The pieces between the separators: one more than there are separators, empty ones included. The
/// views point into `text`. The last of `most` pieces (at least 1) holds the rest unsplit, so that
/// who expects few pieces need not hold the millions of a hostile text.
std::vector<std::string_view> splitAt(std::string_view text, char separator,
                                      std::size_t most = std::string_view::npos);

/// The same, at every horizontal white-space character: tab and Unicode's space separators (Zs).
/// Line breaks do not separate. Every single white-space character separates, so two in a row
/// enclose an empty piece.
std::vector<std::string_view> splitAtWhitespace(std::string_view text,
                                                std::size_t most = std::string_view::npos);

/// The decimal integer at the start of the text: leading white space, one sign and digits, up to
/// the first other character. 0 without digits; the nearest 64-bit number where the digits exceed
/// it.
std::int64_t leadingInteger(std::string_view text);

/// The number of 16-bit units that the text takes in UTF-16.
std::size_t utf16Length(std::string_view text);

/// The number of characters (Unicode code points).
std::size_t characterCount(std::string_view text);

/// The first `count` characters (code points), or all of a shorter text.
std::string_view firstCharacters(std::string_view text, std::size_t count);

}  // namespace platform
