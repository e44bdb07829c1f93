#include "platform/net/URL.h"

#include <unicode/uidna.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <system_error>

#include "platform/net/TransferLibrary.h"
#include "platform/text/ASCII.h"
#include "platform/text/Case.h"
#include "platform/text/Characters.h"

namespace platform {
namespace {

bool isPercentTriplet(std::string_view text, std::size_t at) {
  return at + 2 < text.size() && text[at] == '%' && hexDigitValue(text[at + 1]) >= 0 &&
         hexDigitValue(text[at + 2]) >= 0;
}

/// The text with all bytes percent-encoded but those that the predicate keeps, behind a beginning.
/// The predicate is asked more than once, each time with a reference into the text.
template <typename Predicate>
std::string percentEncoded(std::string_view text, Predicate isKept, std::string_view start = {}) {
  const auto keptCount = std::count_if(text.begin(), text.end(), isKept);
  std::string encoded;
  encoded.reserve(start.size() + 3 * text.size() - 2 * static_cast<std::size_t>(keptCount));
  encoded = start;
  for (const char& c : text) {
    if (isKept(c)) {
      encoded += c;
      continue;
    }
    const auto byte = static_cast<unsigned char>(c);
    encoded += '%';
    encoded += kCapitalHexDigits[byte >> 4U];
    encoded += kCapitalHexDigits[byte & 0xFU];
  }
  return encoded;
}

/// Only characters that RFC 3986 knows, and those of well-formed UTF-8 that are no control
/// characters; a "%" only where it encodes.
bool hasAcceptableCharacters(std::string_view text) {
  constexpr std::string_view kRefused = "<>\"{}|\\^`";
  for (std::size_t position = 0; position < text.size();) {
    const char byte = text[position];
    if (kRefused.find(byte) != std::string_view::npos) return false;
    if (byte == '%' && !isPercentTriplet(text, position)) return false;
    const std::int32_t character = nextCharacter(text, position);
    if (character <= ' ' || (character >= 0x7F && character < 0xA0)) return false;
  }
  return true;
}

/// The components of a URL by RFC 3986, appendix B. The views point into the text.
struct Components {
  std::string_view scheme;
  std::optional<std::string_view> authority;
  std::string_view path;
  std::string_view queryAndFragment;  // with the "?" or "#" that begins it
};

std::optional<Components> componentsOf(std::string_view text) {
  const std::size_t colon = text.find(':');
  if (colon == std::string_view::npos || colon == 0) return std::nullopt;
  Components components;
  components.scheme = text.substr(0, colon);
  std::string_view rest = text.substr(colon + 1);
  if (rest.substr(0, 2) == "//") {
    rest.remove_prefix(2);
    components.authority = rest.substr(0, rest.find_first_of("/?#"));
    rest.remove_prefix(components.authority->size());
  }
  components.path = rest.substr(0, rest.find_first_of("?#"));
  components.queryAndFragment = rest.substr(components.path.size());
  return components;
}

bool isScheme(std::string_view text) {
  return isASCIILetter(text.front()) && std::all_of(text.begin(), text.end(), [](char c) {
           return isASCIILetter(c) || isASCIIDigit(c) || c == '+' || c == '-' || c == '.';
         });
}

struct Authority {
  std::string_view userInfo;  // with the "@" that ends it
  std::string_view host;      // an IP literal with its brackets
  std::string_view port;      // with the ":" that begins it
};

std::optional<Authority> authorityOf(std::string_view text) {
  Authority authority;
  if (const std::size_t at = text.find('@'); at != std::string_view::npos) {
    authority.userInfo = text.substr(0, at + 1);
    text.remove_prefix(at + 1);
  }
  std::size_t hostLength = text.find(':');
  if (text.substr(0, 1) == "[") {
    hostLength = text.find(']');
    if (hostLength == std::string_view::npos) return std::nullopt;
    ++hostLength;
  }
  authority.host = text.substr(0, hostLength);
  authority.port = text.substr(authority.host.size());
  return authority;
}

/// Decimal digits of a number up to 65535 behind a colon; none at all is the scheme's own port.
bool isPort(std::string_view text) {
  if (text.empty() || text == ":") return true;
  const char* const end = text.data() + text.size();
  std::uint16_t number = 0;
  const std::from_chars_result result = std::from_chars(text.data() + 1, end, number);
  return text.front() == ':' && result.ec == std::errc() && result.ptr == end;
}

bool isWellFormed(const Authority& authority) {
  const auto hasBrackets = [](std::string_view text) {
    return text.find_first_of("[]") != std::string_view::npos;
  };
  std::string_view host = authority.host;
  if (host.size() > 2 && host.front() == '[') host = host.substr(1, host.size() - 2);
  return !hasBrackets(authority.userInfo) && !hasBrackets(host) &&
         host.find('@') == std::string_view::npos && isPort(authority.port);
}

/// The host in the ASCII form that the domain name system knows ("bücher.example" gives
/// "xn--bcher-kva.example", and so does "b%C3%BCcher.example"). The transfer library would take the
/// host's encoding from the locale, ICU takes it as the UTF-8 that it is.
std::optional<std::string> hostInASCII(std::string_view writtenHost) {
  const std::string host = percentDecoded(writtenHost);
  if (isASCII(host)) return std::string(writtenHost);
  // A name has 253 characters at most. Decomposed ones take several times as many bytes; beyond
  // that ICU, whose time to put combining marks in order grows with their square, is not asked.
  constexpr std::size_t kLongestHost = 1024;
  if (host.size() > kLongestHost || !hasAcceptableCharacters(host)) return std::nullopt;
  UErrorCode status = U_ZERO_ERROR;
  const std::unique_ptr<UIDNA, decltype(&uidna_close)> converter(
      uidna_openUTS46(UIDNA_CHECK_BIDI | UIDNA_CHECK_CONTEXTJ | UIDNA_NONTRANSITIONAL_TO_ASCII,
                      &status),
      &uidna_close);
  if (U_FAILURE(status) != 0) return std::nullopt;
  std::array<char, 256> ascii{};  // a longer name is an error anyway
  UIDNAInfo info = UIDNA_INFO_INITIALIZER;
  const std::int32_t length =
      uidna_nameToASCII_UTF8(converter.get(), host.data(), static_cast<std::int32_t>(host.size()),
                             ascii.data(), static_cast<std::int32_t>(ascii.size()), &info, &status);
  if (U_FAILURE(status) != 0 || info.errors != 0) return std::nullopt;
  // Some characters become ASCII ones: a full-width "/" would end the host where the text goes on.
  const std::string_view name(ascii.data(), static_cast<std::size_t>(length));
  if (!hasAcceptableCharacters(name) || name.find_first_of("%:/?#[]@") != std::string_view::npos) {
    return std::nullopt;
  }
  return std::string(name);
}

std::string nonASCIIEncoded(std::string_view text) {
  return percentEncoded(text, [](char c) { return isASCII(c); });
}

bool isAcceptedByTransferLibrary(const std::string& encodedText) {
  const TransferLibrary* const library = TransferLibrary::functions();
  if (library == nullptr) return true;  // the transfer will tell what is wrong
  const std::unique_ptr<CURLU, decltype(library->urlCleanup)> handle(library->url(),
                                                                     library->urlCleanup);
  return library->urlSet(handle.get(), CURLUPART_URL, encodedText.c_str(), 0) == CURLUE_OK;
}

}  // namespace

std::optional<URL> URL::parse(std::string_view text) {
  if (!hasAcceptableCharacters(text)) return std::nullopt;
  const std::optional<Components> components = componentsOf(text);
  if (!components || !isScheme(components->scheme)) return std::nullopt;
  // A query and a fragment hold no brackets, and a fragment no second "#".
  const std::string_view tail = components->queryAndFragment;
  if (components->path.find_first_of("[]") != std::string_view::npos ||
      tail.find_first_of("[]") != std::string_view::npos ||
      std::count(tail.begin(), tail.end(), '#') > 1) {
    return std::nullopt;
  }

  URL url;
  url.scheme_ = lowercased(components->scheme);
  url.encodedPath_ = nonASCIIEncoded(components->path);
  url.encodedText_ = std::string(components->scheme) + ":";

  const std::optional<Authority> authority = authorityOf(components->authority.value_or(""));
  if (!authority || !isWellFormed(*authority)) return std::nullopt;
  if (components->authority) {
    const std::optional<std::string> host = hostInASCII(authority->host);
    if (!host) return std::nullopt;
    url.encodedText_ += "//" + nonASCIIEncoded(authority->userInfo) + *host;
    url.encodedText_ += authority->port;
  }
  url.encodedText_ += url.encodedPath_ + nonASCIIEncoded(tail);

  if (url.scheme_ == "file") {
    const std::string host = lowercased(components->authority.value_or(""));
    if (!host.empty() && host != "localhost") return std::nullopt;
    if (url.encodedPath_.empty() || url.encodedPath_.front() != '/') return std::nullopt;
  } else if (url.scheme_ == "http" || url.scheme_ == "https") {
    if (authority->host.empty() || !isAcceptedByTransferLibrary(url.encodedText_)) {
      return std::nullopt;
    }
  }
  return url;
}

std::string URL::path() const {
  return percentDecoded(encodedPath_);
}

std::optional<URL> URL::resolved(std::string_view reference) const {
  reference = reference.substr(0, reference.find('#'));
  const std::size_t end = reference.find_first_of(":/?");
  std::string text;
  if (end == std::string_view::npos || reference[end] != ':') {  // no scheme
    text = scheme_ + ":";
    if (!reference.starts_with("//")) {
      text.append("//").append(componentsOf(encodedText_)->authority.value_or(""));
    }
    if (reference.empty() || reference.front() == '?') {
      text += encodedPath_;
    } else if (reference.front() != '/') {
      text += encodedPath_.empty() ? "/" : encodedPath_.substr(0, encodedPath_.rfind('/') + 1);
    }
  }
  text += reference;

  const std::optional<Components> target = componentsOf(text);
  if (!target) return std::nullopt;
  const auto pathStart = static_cast<std::size_t>(target->path.data() - text.data());
  std::string tail;
  for (std::size_t i = pathStart; i < text.size(); ++i) {
    tail += text[i];
    if (text[i] == '%' && !isPercentTriplet(text, i)) tail += "25";
  }
  return parse(text.substr(0, pathStart) + percentEncoded(tail, [](char c) {
                 constexpr std::string_view kNotAllowed = " <>\"{}|\\^`[]";
                 return isASCII(c) && kNotAllowed.find(c) == std::string_view::npos;
               }));
}

std::string URL::origin() const {
  const Components components = *componentsOf(encodedText_);
  const std::optional<Authority> authority = authorityOf(components.authority.value_or(""));
  std::string_view port = authority->port;
  if (port.size() < 2) port = scheme_ == "https" ? ":443" : ":80";
  return scheme_ + "://" + lowercased(authority->host) + std::string(port);
}

void URL::adoptUserOf(const URL& other) {
  const auto userOf = [](const URL& url) {
    return authorityOf(componentsOf(url.encodedText_)->authority.value_or(""))->userInfo;
  };
  if (!userOf(*this).empty() || origin() != other.origin()) return;
  encodedText_.insert(scheme_.size() + std::string_view("://").size(), userOf(other));
}

std::string percentDecoded(std::string_view text) {
  std::string decoded;
  decoded.reserve(text.size());
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (isPercentTriplet(text, i)) {
      decoded += static_cast<char>(hexDigitValue(text[i + 1]) * 16 + hexDigitValue(text[i + 2]));
      i += 2;
    } else {
      decoded += text[i];
    }
  }
  return decoded;
}

std::string percentEncodedPath(std::string_view path) {
  constexpr std::string_view kAllowedMarks = "-._~!$&'()*+,;=:@/";
  return percentEncoded(path, [=](char c) {
    return isASCIILetter(c) || isASCIIDigit(c) || kAllowedMarks.find(c) != std::string_view::npos;
  });
}

std::string fileURLText(std::string_view absolutePath) {
  return "file://" + percentEncodedPath(absolutePath);
}

}  // namespace platform
