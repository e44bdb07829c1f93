#include "platform/text/TextHelpers.h"

#include <unicode/bytestream.h>
#include <unicode/casemap.h>
#include <unicode/stringpiece.h>
#include <unicode/utf8.h>

#include <algorithm>
#include <charconv>
#include <limits>
#include <system_error>

namespace platform {
namespace {

bool isASCII(std::string_view text) {
  return std::all_of(text.begin(), text.end(),
                     [](char byte) { return static_cast<unsigned char>(byte) < 0x80; });
}

/// Takes the character at `position` and moves behind it; negative for a malformed sequence.
UChar32 nextCharacter(std::string_view text, std::size_t& position) {
  const char* bytes = text.data();
  UChar32 character = 0;
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wconversion"  // within the macro
  U8_NEXT(bytes, position, text.size(), character);
#pragma GCC diagnostic pop
  return character;
}

bool isHorizontalWhitespace(UChar32 character) {
  switch (character) {
    case '\t':
    case ' ':
    case 0x00A0:
    case 0x1680:
    case 0x202F:
    case 0x205F:
    case 0x3000:
      return true;
    default:
      return character >= 0x2000 && character <= 0x200A;
  }
}

bool isLineBreak(UChar32 character) {
  return character >= '\n' && character <= '\r';
}

/// Room for all pieces where few are expected, as in each of the dates of a feed.
std::vector<std::string_view> roomForPieces(std::size_t most) {
  constexpr std::size_t kFew = 8;
  std::vector<std::string_view> pieces;
  pieces.reserve(std::min(most, kFew));
  return pieces;
}

using CaseMapping = void (*)(const char*, std::uint32_t, icu::StringPiece, icu::ByteSink&,
                             icu::Edits*, UErrorCode&);

std::string caseMapped(std::string_view text, CaseMapping mapping) {
  // ICU counts in 32 bits and lets the result grow to three times the text.
  constexpr std::size_t kPieceLimit = std::numeric_limits<std::int32_t>::max() / 4;
  std::string result;
  result.reserve(text.size());
  icu::StringByteSink<std::string> sink(&result);
  while (!text.empty()) {
    std::size_t length = text.size();
    if (length > kPieceLimit) {
      const char* bytes = text.data();
      length = kPieceLimit;
      U8_TRUNCATE_IF_INCOMPLETE(bytes, 0, length);
    }
    UErrorCode status = U_ZERO_ERROR;
    mapping("", 0, icu::StringPiece(text.data(), static_cast<std::int32_t>(length)), sink, nullptr,
            status);
    text.remove_prefix(length);
  }
  return result;
}

}  // namespace

std::string lowercased(std::string_view text) {
  if (!isASCII(text)) return caseMapped(text, icu::CaseMap::utf8ToLower);
  std::string result(text);
  for (char& byte : result) {
    if (byte >= 'A' && byte <= 'Z') byte = static_cast<char>(byte - 'A' + 'a');
  }
  return result;
}

std::string uppercased(std::string_view text) {
  if (!isASCII(text)) return caseMapped(text, icu::CaseMap::utf8ToUpper);
  std::string result(text);
  for (char& byte : result) {
    if (byte >= 'a' && byte <= 'z') byte = static_cast<char>(byte - 'a' + 'A');
  }
  return result;
}

std::string replacingAll(std::string_view text, std::string_view target,
                         std::string_view replacement) {
  std::string result;
  result.reserve(text.size());
  for (std::size_t found = text.find(target); found != std::string_view::npos;
       found = text.find(target)) {
    result.append(text.substr(0, found)).append(replacement);
    text.remove_prefix(found + target.size());
  }
  return result.append(text);
}

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

std::int64_t leadingInteger(std::string_view text) {
  std::size_t start = 0;
  for (std::size_t position = 0; position < text.size(); start = position) {
    const UChar32 character = nextCharacter(text, position);
    if (!isHorizontalWhitespace(character) && !isLineBreak(character)) break;
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

std::size_t utf16Length(std::string_view text) {
  std::size_t length = 0;
  for (std::size_t position = 0; position < text.size();) {
    length += nextCharacter(text, position) > 0xFFFF ? 2 : 1;
  }
  return length;
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

}  // namespace platform
