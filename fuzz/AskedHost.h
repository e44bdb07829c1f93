#pragma once

#include <string>
#include <string_view>

/// A host and its port, in a form in which two texts that name the same server are equal.
struct Server {
  std::string host;
  std::string port;  // empty for the scheme's own
  bool operator==(const Server&) const = default;
};

/// The server that an http or https URL shows to whoever reads it, by RFC 3986, appendix B, alone.
Server shownServer(std::string_view url);

/// The server that the transfer library asks when it is handed the URL; no host where it takes
/// none, and where it would turn letters of the host into ASCII by itself.
Server askedServer(const std::string& url);
