#include "fuzz/AskedHost.h"

#include <arpa/inet.h>
#include <curl/curl.h>
#include <dlfcn.h>
#include <unicode/uidna.h>

#include <algorithm>
#include <array>
#include <memory>

#include "platform/net/URL.h"
#include "platform/text/ASCII.h"
#include "platform/text/Case.h"

namespace {

/// A function of the library that the tool loads, too; null without it.
template <typename Function>
Function* find(const char* name) {
  static void* const library = dlopen("libcurl.so.4", RTLD_LAZY | RTLD_LOCAL);
  return library != nullptr ? reinterpret_cast<Function*>(dlsym(library, name)) : nullptr;
}

/// An address as its bytes, a name in the letters that it stands for ("xn--bcher-kva" is "bücher").
std::string normalised(const std::string& host) {
  in6_addr address{};
  if (host.starts_with('[')) {
    const std::string text = host.substr(1, host.find_first_of("]%") - 1);
    inet_pton(AF_INET6, text.c_str(), &address);
    return {reinterpret_cast<const char*>(&address), sizeof(address)};
  }
  UErrorCode status = U_ZERO_ERROR;
  const std::unique_ptr<UIDNA, decltype(&uidna_close)> converter(
      uidna_openUTS46(UIDNA_NONTRANSITIONAL_TO_UNICODE, &status), &uidna_close);
  std::array<char, 2048> name{};
  UIDNAInfo info = UIDNA_INFO_INITIALIZER;
  const std::int32_t length = uidna_nameToUnicodeUTF8(
      converter.get(), host.data(), static_cast<std::int32_t>(host.size()), name.data(),
      static_cast<std::int32_t>(name.size()) - 1, &info, &status);
  if (U_FAILURE(status) != 0) return platform::lowercased(host);
  in_addr number{};
  if (inet_aton(name.data(), &number) == 0) return {name.data(), static_cast<std::size_t>(length)};
  return {reinterpret_cast<const char*>(&number), sizeof(number)};
}

std::string withoutZeros(std::string_view port) {
  return std::string(port.substr(std::min(port.find_first_not_of('0'), port.size())));
}

}  // namespace

Server shownServer(std::string_view url) {
  url.remove_prefix(url.find("//") + 2);
  url = url.substr(0, url.find_first_of("/?#"));
  url.remove_prefix(url.rfind('@') + 1);  // none is the last position there is
  const std::size_t colon = url.find(':', url.starts_with('[') ? url.find(']') : 0);
  const bool hasPort = colon != std::string_view::npos;
  // In an address a "%" begins the zone.
  const std::string host(url.substr(0, colon));
  return {normalised(host.starts_with('[') ? host : platform::percentDecoded(host)),
          hasPort ? withoutZeros(url.substr(colon + 1)) : ""};
}

Server askedServer(const std::string& url) {
  static auto* const make = find<decltype(curl_url)>("curl_url");
  static auto* const cleanUp = find<decltype(curl_url_cleanup)>("curl_url_cleanup");
  static auto* const set = find<decltype(curl_url_set)>("curl_url_set");
  static auto* const get = find<decltype(curl_url_get)>("curl_url_get");
  static auto* const release = find<decltype(curl_free)>("curl_free");
  if (make == nullptr) return shownServer(url);  // without the library nobody is asked
  const std::unique_ptr<CURLU, decltype(cleanUp)> handle(make(), cleanUp);
  if (set(handle.get(), CURLUPART_URL, url.c_str(), 0) != CURLUE_OK) return {};
  const auto part = [&](CURLUPart which) {
    char* text = nullptr;
    if (get(handle.get(), which, &text, 0) != CURLUE_OK) return std::string();
    const std::unique_ptr<char, decltype(release)> owner(text, release);
    return std::string(text);
  };
  const std::string host = part(CURLUPART_HOST);
  if (!platform::isASCII(host)) return {};  // what is asked then depends on the locale
  return {normalised(host), withoutZeros(part(CURLUPART_PORT))};
}
