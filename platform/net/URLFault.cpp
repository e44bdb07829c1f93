#include "platform/net/URLFault.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>

#include "platform/net/URL.h"
#include "platform/text/ASCII.h"
#include "platform/text/Case.h"
#include "platform/text/Characters.h"

namespace platform {
namespace {

std::string quoted(std::string_view text) {
  return std::string(1, '"').append(text).append(1, '"');
}

std::string written(char character) {
  const auto byte = static_cast<unsigned char>(character);
  return quoted({&character, 1}) + " is written %" + kCapitalHexDigits[byte >> 4U] +
         kCapitalHexDigits[byte & 0xFU];
}

std::string authorityFault(std::string_view authority) {
  std::string_view host = authority.substr(authority.rfind('@') + 1);
  const std::size_t colon = host.find(':', host.starts_with('[') ? host.find(']') : 0);
  const std::string_view port = host.substr(std::min(colon, host.size()));
  host = host.substr(0, host.size() - port.size());
  if (host.empty()) return "it has no host";
  if (port.size() > 1) return quoted(port.substr(1)) + " is no port";
  return quoted(host) + " is no host";
}

}  // namespace

bool hasFetchedScheme(std::string_view text) {
  const std::string start = lowercased(firstCharacters(text, 6));
  return start.starts_with("http:") || start == "https:" || start.starts_with("file:");
}

bool looksLikeURL(std::string_view text) {
  const std::size_t colon = text.find("://");
  const auto isOfScheme = [](char c) {
    return isASCIILetter(c) || isASCIIDigit(c) || c == '+' || c == '.' || c == '-';
  };
  if (hasFetchedScheme(text)) return true;
  return colon != std::string_view::npos && isASCIILetter(text.front()) &&
         std::all_of(text.begin(), text.begin() + static_cast<std::ptrdiff_t>(colon), isOfScheme);
}

std::string urlFault(std::string_view text) {
  if (!hasFetchedScheme(text)) return "only http:, https: and file: URLs are fetched";
  if (URL::parse(text)) return "";
  for (std::size_t position = 0; position < text.size();) {
    const char first = text[position];
    const std::int32_t character = nextCharacter(text, position);
    if (std::string_view(" <>\"{}|\\^`").find(first) != std::string_view::npos) {
      return written(first);
    }
    if (character >= 0 && (character < 0x20 || (character >= 0x7F && character < 0xA0))) {
      return "it holds a control character";
    }
    const auto isHex = [&](std::size_t at) {
      return at < text.size() && hexDigitValue(text[at]) >= 0;
    };
    if (first == '%' && !(isHex(position) && isHex(position + 1))) return written('%');
  }
  const std::size_t colon = text.find(':');
  const bool hasAuthority = text.substr(colon + 1).starts_with("//");
  const std::size_t start = colon + (hasAuthority ? 3 : 1);
  const std::size_t end = std::min(text.find_first_of("/?#", start), text.size());
  const std::string_view authority = hasAuthority ? text.substr(start, end - start) : "";
  const std::string_view rest = text.substr(hasAuthority ? end : start);
  for (const char bracket : {'[', ']'}) {
    if (rest.find(bracket) != std::string_view::npos) return written(bracket);
  }
  if (std::count(rest.begin(), rest.end(), '#') > 1) return "a second \"#\" is written %23";
  if (lowercased(text.substr(0, colon)) != "file") return authorityFault(authority);
  if (authority.empty()) return "the path of a file: URL begins with a /";
  return "a file: URL begins with file:///, and " + quoted(authority) + " is taken for a host";
}

}  // namespace platform
