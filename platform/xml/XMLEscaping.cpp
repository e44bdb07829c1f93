#include "platform/xml/XMLEscaping.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>

#include "platform/text/ASCII.h"
#include "platform/text/Characters.h"

namespace platform {
namespace {

/// Tells the bytes that are copied as they are from the special ones: those that become a reference
/// or nothing, and those from 0x80 on, where the whole character must be checked.
class ByteRules {
 public:
  explicit constexpr ByteRules(bool isAttribute) {
    for (std::size_t byte = 0; byte < 0x20; ++byte) isSpecial_[byte] = true;
    for (std::size_t byte = 0x80; byte < 0x100; ++byte) isSpecial_[byte] = true;
    for (const char character : {'&', '<', '>'}) isSpecial_[index(character)] = true;
    for (const char character : {'\t', '\n'}) isSpecial_[index(character)] = isAttribute;
    isSpecial_[index('"')] = isAttribute;
  }
  constexpr bool isSpecial(char byte) const { return isSpecial_[index(byte)]; }

 private:
  static constexpr std::size_t index(char byte) { return static_cast<unsigned char>(byte); }
  std::array<bool, 256> isSpecial_{};
};

constexpr ByteRules kTextRules(false);
constexpr ByteRules kAttributeRules(true);

/// Empty for what is left out.
constexpr std::string_view reference(char character) {
  switch (character) {
    case '&':
      return "&amp;";
    case '<':
      return "&lt;";
    case '>':
      return "&gt;";
    case '"':
      return "&quot;";
    case '\t':
      return "&#9;";
    case '\n':
      return "&#10;";
    case '\r':
      return "&#13;";
    default:
      return {};
  }
}

// The length of the character that the text begins with, which is not ASCII; 0 when it is
// malformed, or none that XML can hold.
std::size_t lengthOfAllowedCharacter(std::string_view text) {
  std::size_t length = 0;
  const std::int32_t character = nextCharacter(text, length);
  return character < 0x80 || character == 0xFFFE || character == 0xFFFF ? 0 : length;
}

void appendEscaped(std::string& output, std::string_view text, const ByteRules& rules) {
  const auto isSpecial = [&rules](char byte) { return rules.isSpecial(byte); };
  const char* const end = text.data() + text.size();
  const char* run = text.data();  // of bytes that stay as they are
  const char* next = run;
  while ((next = std::find_if(next, end, isSpecial)) != end) {
    if (const std::size_t length = lengthOfAllowedCharacter({next, end})) {
      next += length;
      continue;
    }
    output.append(run, next);
    output.append(reference(*next));
    run = ++next;
  }
  output.append(run, end);
}

}  // namespace

bool isXMLText(std::string_view text) {
  std::size_t next = 0;
  while (next < text.size()) {
    const auto byte = static_cast<unsigned char>(text[next]);
    if (byte < 0x20 && reference(text[next]).empty()) return false;
    const std::size_t length = byte < 0x80 ? 1 : lengthOfAllowedCharacter(text.substr(next));
    if (length == 0) return false;
    next += length;
  }
  return true;
}

std::string textReadBack(std::string_view text) {
  if (isXMLText(text)) return std::string(text);
  std::string kept;
  for (std::size_t next = 0; next < text.size();) {
    const std::size_t begin = next;
    nextCharacter(text, next);
    const std::string_view character = text.substr(begin, next - begin);
    if (isXMLText(character)) kept += character;
  }
  return kept;
}

std::size_t sizeOfReferences(std::string_view text) {
  std::size_t size = 0;
  for (const char byte : text) {
    if (isASCII(byte) && kAttributeRules.isSpecial(byte)) {
      const std::size_t length = reference(byte).size();
      if (length > 0) size += length - 1;
    }
  }
  return size;
}

void appendEscapedText(std::string& output, std::string_view text) {
  appendEscaped(output, text, kTextRules);
}

void appendEscapedAttribute(std::string& output, std::string_view value) {
  appendEscaped(output, value, kAttributeRules);
}

}  // namespace platform
