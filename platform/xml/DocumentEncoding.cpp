#include "platform/xml/DocumentEncoding.h"

#include <algorithm>
#include <array>

#include "platform/text/ASCII.h"
#include "platform/text/Characters.h"
#include "platform/text/TextEncoding.h"

namespace platform {

using namespace std::string_view_literals;

namespace {

struct ByteOrderMark {
  std::string_view bytes;
  std::string_view encoding;
};
/// The marks of UTF-32 stand before those of UTF-16 that they begin with.
constexpr std::array<ByteOrderMark, 5> kByteOrderMarks = {{{"\xEF\xBB\xBF", "UTF-8"},
                                                           {"\xFF\xFE\0\0"sv, "UTF-32LE"},
                                                           {"\0\0\xFE\xFF"sv, "UTF-32BE"},
                                                           {"\xFF\xFE"sv, "UTF-16LE"},
                                                           {"\xFE\xFF"sv, "UTF-16BE"}}};

/// The encoding that shows in the zeros around the first character, which is "<" or white space.
/// Empty for one without zeros.
std::string_view encodingOfZeros(std::string_view bytes) {
  if (bytes.size() < 4) return {};
  const auto isZero = [bytes](std::size_t index) { return bytes[index] == '\0'; };
  if (isZero(0) && isZero(1) && isZero(2)) return "UTF-32BE";
  if (isZero(1) && isZero(2) && isZero(3)) return "UTF-32LE";
  if (isZero(0)) return "UTF-16BE";
  if (isZero(1)) return "UTF-16LE";
  return {};
}

bool isEncodingName(std::string_view name) {
  return !name.empty() && isASCIILetter(name.front()) && std::ranges::all_of(name, [](char c) {
    return isASCIILetter(c) || isASCIIDigit(c) || "._-"sv.find(c) != std::string_view::npos;
  });
}

/// The encoding that the XML declaration names; empty when there is none, and when the declaration
/// is malformed, which is then the parser's to tell.
std::string_view declaredEncoding(std::string_view bytes) {
  constexpr std::string_view kDeclarationStart = "<?xml";
  std::string_view text = trimmed(bytes);
  if (!text.starts_with(kDeclarationStart)) return {};
  text = text.substr(kDeclarationStart.size(), text.find('>') - kDeclarationStart.size());
  while (true) {
    text = trimmed(text);
    const std::string_view name = text.substr(0, text.find_first_of("= \t\r\n"));
    text = trimmed(text.substr(name.size()));
    if (!text.starts_with('=')) return {};
    text = trimmed(text.substr(1));
    if (!text.starts_with('"') && !text.starts_with('\'')) return {};
    const std::size_t end = text.find(text.front(), 1);
    if (end == std::string_view::npos) return {};
    const std::string_view value = text.substr(1, end - 1);
    text.remove_prefix(end + 1);
    if (name == "encoding") return isEncodingName(value) ? value : std::string_view();
  }
}

std::optional<std::string> encodingMeantBy(std::string_view label) {
  std::optional<std::string> name = canonicalEncodingName(label);
  if (name && (name->starts_with("UTF-16") || name->starts_with("UTF-32"))) return "UTF-8";
  if (name == "ISO-8859-1" || name == "US-ASCII") return "windows-1252";
  return name;
}

}  // namespace

DocumentEncoding DocumentEncoding::of(std::string_view bytes, std::string_view hint) {
  for (const ByteOrderMark& mark : kByteOrderMarks) {
    if (bytes.starts_with(mark.bytes)) {
      return {.name = std::string(mark.encoding), .markLength = mark.bytes.size()};
    }
  }
  const std::string_view shown = encodingOfZeros(bytes);
  if (!shown.empty()) return {.name = std::string(shown)};
  const std::string_view label = declaredEncoding(bytes);
  if (label.empty()) {
    const std::optional<std::string> hinted = encodingMeantBy(hint);
    return {.name = hinted && !isUTF8(bytes) ? hinted : "UTF-8"};
  }
  return {.name = encodingMeantBy(label),
          .label = std::string(label),
          .position = positionBehind({bytes.data(), label.data()})};
}

}  // namespace platform
