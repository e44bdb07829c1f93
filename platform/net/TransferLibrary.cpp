#include "platform/net/TransferLibrary.h"

#include <dlfcn.h>

#include <algorithm>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>

#include "platform/text/Memory.h"

namespace platform {
namespace {

/// The file of the only binary interface that the library has had since 2006.
constexpr const char* kFile = "libcurl.so.4";

ErrorRecord loadingError() {
  const char* const cause = dlerror();
  std::string description = cause != nullptr ? cause : "libcurl cannot be loaded";
  // A file that was found is called by its whole path.
  if (std::string_view(description).starts_with(kFile)) {
    description +=
        "; http and https need it: install the package libcurl4 (Debian, Ubuntu) or libcurl "
        "(Fedora)";
  }
  return transferError(CURLE_FAILED_INIT, std::move(description));
}

}  // namespace

ErrorRecord transferError(CURLcode code, std::string_view description) {
  std::string shown(description.substr(0, description.find_last_not_of(".\r\n") + 1));
  std::replace_if(
      shown.begin(), shown.end(), [](char c) { return c < ' ' || c > '~'; }, '?');
  return {"transfer", code, std::move(shown)};
}

TransferLibrary::TransferLibrary() {
  // It stays loaded: what it registered with the thread and the process outlives every transfer.
  void* const library = dlopen(kFile, RTLD_LAZY | RTLD_LOCAL);
  if (library == nullptr) {
    error_ = loadingError();
    return;
  }
  const auto find = [this, library](auto& function, const char* name) {
    function = reinterpret_cast<std::decay_t<decltype(function)>>(dlsym(library, name));
    if (function == nullptr && !error_) error_ = loadingError();
  };
  find(globalInit, "curl_global_init_mem");
  find(easyInit, "curl_easy_init");
  find(easyCleanup, "curl_easy_cleanup");
  find(easySetopt, "curl_easy_setopt");
  find(easyGetinfo, "curl_easy_getinfo");
  find(easyHeader, "curl_easy_header");
  find(easyStrerror, "curl_easy_strerror");
  find(multiInit, "curl_multi_init");
  find(multiCleanup, "curl_multi_cleanup");
  find(multiAddHandle, "curl_multi_add_handle");
  find(multiRemoveHandle, "curl_multi_remove_handle");
  find(multiPoll, "curl_multi_poll");
  find(multiPerform, "curl_multi_perform");
  find(multiInfoRead, "curl_multi_info_read");
  find(url, "curl_url");
  find(urlCleanup, "curl_url_cleanup");
  find(urlSet, "curl_url_set");
  if (error_) return;
  const CURLcode result =
      globalInit(CURL_GLOBAL_DEFAULT, &Memory::allocate, &Memory::release, &Memory::reallocate,
                 &Memory::duplicate, &Memory::allocateZeroed);
  if (result != CURLE_OK) error_ = transferError(result, easyStrerror(result));
}

const TransferLibrary& TransferLibrary::instance() {
  static const TransferLibrary library;
  return library;
}

}  // namespace platform
