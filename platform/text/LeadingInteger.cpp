#include "platform/text/LeadingInteger.h"

#include <charconv>
#include <cstddef>
#include <limits>
#include <system_error>

#include "platform/text/Characters.h"

namespace platform {

std::int64_t leadingInteger(std::string_view text) {
  std::size_t start = 0;
  for (std::size_t position = 0; position < text.size(); start = position) {
    const std::int32_t character = nextCharacter(text, position);
    const bool isLineBreak = character >= '\n' && character <= '\r';
    if (!isLineBreak && !isHorizontalWhitespace(character)) break;
  }
  text.remove_prefix(start);
  if (text.starts_with('+')) {
    text.remove_prefix(1);
    if (text.starts_with('-')) return 0;  // only from_chars would take it for a second sign
  }
  std::int64_t number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (error == std::errc::result_out_of_range) {
    return text.starts_with('-') ? std::numeric_limits<std::int64_t>::min()
                                 : std::numeric_limits<std::int64_t>::max();
  }
  return number;
}

}  // namespace platform
