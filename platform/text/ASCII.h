#pragma once

#include <algorithm>
#include <string_view>

namespace platform {

/// What texts of any encoding of ours share with ASCII: the formats that are made of it (URLs, the
/// markup of XML, header fields, base64) are read by these, whatever the locale. A byte of a
/// non-ASCII character is neither a digit nor a letter nor white space.

/// The white space of XML 1.0 (production S) and of HTTP's header lines.
inline constexpr std::string_view kWhitespace = " \t\r\n";

/// The digits 0 to 15 of base 16.
inline constexpr std::string_view kHexDigits = "0123456789abcdef";
inline constexpr std::string_view kCapitalHexDigits = "0123456789ABCDEF";

constexpr bool isASCII(char c) {
  return static_cast<unsigned char>(c) < 0x80;
}
constexpr bool isASCII(std::string_view text) {
  return std::all_of(text.begin(), text.end(), [](char c) { return isASCII(c); });
}

constexpr bool isASCIIDigit(char c) {
  return c >= '0' && c <= '9';
}
constexpr bool isASCIILetter(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}

/// An ASCII letter in lower (upper) case; anything else as it is.
constexpr char lowercasedASCII(char c) {
  return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}
constexpr char uppercasedASCII(char c) {
  return c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c;
}

/// The number, 0 to 15, that a hexadecimal digit of either case stands for; -1 for anything else.
constexpr int hexDigitValue(char c) {
  if (isASCIIDigit(c)) return c - '0';
  const char lower = lowercasedASCII(c);
  return lower >= 'a' && lower <= 'f' ? lower - 'a' + 10 : -1;
}

/// The text without the white space at its beginning and its end; a view into it.
constexpr std::string_view trimmed(std::string_view text) {
  text.remove_prefix(std::min(text.find_first_not_of(kWhitespace), text.size()));
  return text.substr(0, text.find_last_not_of(kWhitespace) + 1);
}

}  // namespace platform
