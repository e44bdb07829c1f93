#include "platform/text/TextEncoding.h"

#include <unicode/ucnv.h>
#include <unicode/ucnv_cb.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <utility>

namespace platform {
namespace {

struct ConverterCloser {
  void operator()(UConverter* converter) const { ucnv_close(converter); }
};
using Converter = std::unique_ptr<UConverter, ConverterCloser>;

/// An empty name would stand for the default encoding of the process, and a NUL would cut the name.
bool isPlausibleName(std::string_view encoding) {
  return !encoding.empty() && encoding.find('\0') == std::string_view::npos;
}

/// The library's own substitution writes U+001A for some encodings.
void writeReplacementCharacter(const void* /*context*/, UConverterToUnicodeArgs* arguments,
                               const char* /*bytes*/, std::int32_t /*length*/,
                               UConverterCallbackReason reason, UErrorCode* status) {
  if (reason > UCNV_IRREGULAR) return;  // not about the input: the converter is reset or closed
  *status = U_ZERO_ERROR;
  const UChar replacement = 0xFFFD;
  ucnv_cbToUWriteUChars(arguments, &replacement, 1, 0, status);
}

Converter openConverter(const std::string& encoding) {
  UErrorCode status = U_ZERO_ERROR;
  Converter converter(ucnv_open(encoding.c_str(), &status));
  return U_SUCCESS(status) != 0 ? std::move(converter) : nullptr;
}

}  // namespace

std::optional<std::string> convertedToUTF8(std::string_view bytes, std::string_view encoding) {
  if (!isPlausibleName(encoding)) return std::nullopt;
  const Converter from = openConverter(std::string(encoding));
  const Converter to = openConverter("UTF-8");
  if (!from || !to) return std::nullopt;
  UErrorCode status = U_ZERO_ERROR;
  ucnv_setToUCallBack(from.get(), writeReplacementCharacter, nullptr, nullptr, nullptr, &status);

  std::array<UChar, 4096> pivot{};
  UChar* pivotSource = pivot.data();
  UChar* pivotTarget = pivot.data();
  const char* source = bytes.data();
  const char* const sourceEnd = source + bytes.size();

  std::string result(bytes.size() + bytes.size() / 8 + 16, '\0');
  std::size_t written = 0;
  for (bool first = true;; first = false) {
    char* target = result.data() + written;
    status = U_ZERO_ERROR;
    ucnv_convertEx(to.get(), from.get(), &target, result.data() + result.size(), &source, sourceEnd,
                   pivot.data(), &pivotSource, &pivotTarget, pivot.data() + pivot.size(),
                   static_cast<UBool>(first), static_cast<UBool>(true), &status);
    written = static_cast<std::size_t>(target - result.data());
    if (status != U_BUFFER_OVERFLOW_ERROR) break;
    result.resize(result.size() * 2);
  }
  if (U_FAILURE(status) != 0) return std::nullopt;
  result.resize(written);
  return result;
}

std::optional<std::string> canonicalEncodingName(std::string_view encoding) {
  if (!isPlausibleName(encoding)) return std::nullopt;
  UErrorCode status = U_ZERO_ERROR;
  const char* const name = ucnv_getAlias(std::string(encoding).c_str(), 0, &status);
  if (name == nullptr) return std::nullopt;
  return name;
}

}  // namespace platform
