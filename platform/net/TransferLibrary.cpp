#include "platform/net/TransferLibrary.h"

#include <dlfcn.h>

#include <algorithm>
#include <string>
#include <string_view>
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

TransferLibrary::Symbol TransferLibrary::findIfThere(const char* name) {
  // It stays loaded: what it registered with the thread and the process outlives every transfer.
  static void* const file = dlopen(kFile, RTLD_LAZY | RTLD_LOCAL);
  return {file != nullptr ? dlsym(file, name) : nullptr};
}

TransferLibrary::Symbol TransferLibrary::find(const char* name) {
  const Symbol symbol = findIfThere(name);
  if (symbol.address == nullptr && !error_) error_ = loadingError();
  return symbol;
}

TransferLibrary::TransferLibrary() {
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
