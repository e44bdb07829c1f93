#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

namespace platform {

/// The columns of the terminal that standard output is, 80 where it does not tell; absent where
/// standard output is none, or one that cannot move its cursor (TERM is "dumb" or missing).
std::optional<std::size_t> terminalColumns();

/// The text as a terminal may be given it: control characters (C0, DEL and C1), which could steer
/// it, and what is no UTF-8, show as U+FFFD.
std::string harmlessText(std::string_view text);

/// The harmless text cut or filled up with blanks to take exactly so many columns, wide characters
/// (those of East Asia, most emoji) counted as two, combining ones as none.
std::string textOfWidth(std::string_view text, std::size_t columns);

}  // namespace platform
