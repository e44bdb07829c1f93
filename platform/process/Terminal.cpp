#include "platform/process/Terminal.h"

#include <sys/ioctl.h>
#include <unicode/uchar.h>
#include <unistd.h>

#include <cstdint>
#include <cstdlib>

#include "platform/text/Characters.h"

namespace platform {
namespace {

bool isControl(std::int32_t character) {
  return character < ' ' || (character >= 0x7F && character < 0xA0);
}

std::size_t columnsOf(std::int32_t character) {
  const auto type = static_cast<unsigned>(u_charType(character));
  if ((U_MASK(type) & (U_GC_MN_MASK | U_GC_ME_MASK | U_GC_CF_MASK)) != 0) return 0;
  const int width = u_getIntPropertyValue(character, UCHAR_EAST_ASIAN_WIDTH);
  return width == U_EA_WIDE || width == U_EA_FULLWIDTH ? 2 : 1;
}

}  // namespace

std::optional<std::size_t> terminalColumns() {
  constexpr std::size_t kUsual = 80;
  const char* const kind = std::getenv("TERM");
  if (::isatty(STDOUT_FILENO) != 1 || kind == nullptr) return std::nullopt;
  if (*kind == '\0' || std::string_view(kind) == "dumb") return std::nullopt;
  winsize size{};
  if (::ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) != 0 || size.ws_col == 0) return kUsual;
  return size.ws_col;
}

std::string harmlessText(std::string_view text) {
  constexpr std::string_view kReplacement = "\uFFFD";
  std::string harmless;
  for (std::size_t position = 0; position < text.size();) {
    const std::size_t begin = position;
    const std::int32_t character = nextCharacter(text, position);
    harmless += isControl(character) ? kReplacement : text.substr(begin, position - begin);
  }
  return harmless;
}

std::string textOfWidth(std::string_view text, std::size_t columns) {
  const std::string harmless = harmlessText(text);
  std::size_t end = 0;
  std::size_t width = 0;
  for (std::size_t position = 0; position < harmless.size();) {
    const std::size_t next = width + columnsOf(nextCharacter(harmless, position));
    if (next > columns) break;
    width = next;
    end = position;
  }
  return harmless.substr(0, end).append(columns - width, ' ');
}

}  // namespace platform
