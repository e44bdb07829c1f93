#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace platform {

/// An absolute URL (RFC 3986); what is valid for http and https is what the transfer library takes.
///
/// Refused are: texts without a scheme, white space, control characters, any of <>"{}|\^ and the
/// backquote, a "%" that two hexadecimal digits do not follow, brackets but around an IP address,
/// an http or https URL without "//" and a host, a file: URL with a host other than none or
/// localhost or with a relative path. Non-ASCII characters (of valid UTF-8) are accepted and count
/// as percent-encoded, those of the host as its internationalised name. Any other scheme is valid.
///
///     const std::optional<URL> url = URL::parse("https://bücher.example/a%20b.mp3?x=1");
///     if (!url) return;    // not one that could be fetched
///     url->encodedText();  // "https://xn--bcher-kva.example/a%20b.mp3?x=1"
///     url->path();         // "/a b.mp3"
class URL {
 public:
  static std::optional<URL> parse(std::string_view text);

  /// The URL as it is sent: non-ASCII characters percent-encoded, a host with such characters in
  /// its ASCII form ("xn--...").
  const std::string& encodedText() const { return encodedText_; }
  /// In lower case: "http", "https", "file", ...
  const std::string& scheme() const { return scheme_; }
  /// The path as it stands, percent-encoded, without query and fragment.
  const std::string& encodedPath() const { return encodedPath_; }
  /// The path percent-decoded; may hold any byte, NUL included.
  std::string path() const;

  /// What a reference in this resource, such as a redirect's Location, leads to (RFC 3986, section
  /// 5.2; dots in the path stay). Servers send more than the grammar allows, and clients take it:
  /// what a path or query may not hold is percent-encoded, but for control characters. A fragment
  /// is left out. Absent where no valid URL comes of it.
  std::optional<URL> resolved(std::string_view reference) const;
  /// Makes user and password those of the other URL, where this one names none and leads to the
  /// same scheme, host and port.
  void adoptUserOf(const URL& other);

 private:
  std::string origin() const;

  std::string encodedText_;
  std::string scheme_;
  std::string encodedPath_;
};

/// The text percent-decoded: "%41" gives "A". A "%" without two hexadecimal digits stays.
std::string percentDecoded(std::string_view text);

/// The path with every byte percent-encoded that RFC 3986 does not allow in one: "a b/c" gives
/// "a%20b/c".
std::string percentEncodedPath(std::string_view path);

/// The file URL of an absolute path: "/a b" gives "file:///a%20b".
std::string fileURLText(std::string_view absolutePath);

}  // namespace platform
