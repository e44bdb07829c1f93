#include "platform/text/Case.h"

#include <unicode/bytestream.h>
#include <unicode/casemap.h>
#include <unicode/stringpiece.h>
#include <unicode/utf8.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <iterator>
#include <limits>

#include "platform/text/ASCII.h"

namespace platform {
namespace {

/// Folding knows no locale.
void foldUTF8(const char* /*locale*/, std::uint32_t options, icu::StringPiece text,
              icu::ByteSink& sink, icu::Edits* edits, UErrorCode& status) {
  icu::CaseMap::utf8Fold(options, text, sink, edits, status);
}

using CaseMapping = void (*)(const char*, std::uint32_t, icu::StringPiece, icu::ByteSink&,
                             icu::Edits*, UErrorCode&);

std::string caseMapped(std::string_view text, char (*asciiMapping)(char), CaseMapping mapping) {
  // ICU counts in 32 bits and lets the result grow to three times the text.
  constexpr std::size_t kPieceLimit = std::numeric_limits<std::int32_t>::max() / 4;
  std::string result;
  result.reserve(text.size());
  if (isASCII(text)) {
    std::transform(text.begin(), text.end(), std::back_inserter(result), asciiMapping);
    return result;
  }
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
  return caseMapped(text, lowercasedASCII, icu::CaseMap::utf8ToLower);
}

std::string uppercased(std::string_view text) {
  return caseMapped(text, uppercasedASCII, icu::CaseMap::utf8ToUpper);
}

std::string caseFolded(std::string_view text) {
  return caseMapped(text, lowercasedASCII, foldUTF8);
}

}  // namespace platform
