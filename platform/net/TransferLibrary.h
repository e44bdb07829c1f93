#pragma once

#include <curl/curl.h>

#include <string_view>

#include "platform/text/ErrorRecord.h"

namespace platform {

/// The record of a failed transfer, whatever noticed it: domain "transfer", with the library's
/// codes.
///
/// The library's descriptions quote what servers sent, and some end like sentences. None of that
/// may steer a terminal or break the encoding: anything but printable ASCII is shown as "?".
ErrorRecord transferError(CURLcode code, std::string_view description);

/// The functions of libcurl that we call. For the use of platform/ alone.
///
/// The library is not linked but loaded when its first function is asked for: it brings some forty
/// other libraries along, and only http and https need any of them. Loading those takes longer than
/// the whole rest of a run that reads and writes local files. Once loaded it is set up for use.
class TransferLibrary {
 public:
  /// The functions; null when the library cannot be loaded or set up.
  static const TransferLibrary* functions() { return instance().error_ ? nullptr : &instance(); }
  /// Why there are no functions; empty when there are.
  static const ErrorSlot& error() { return instance().error_; }

  decltype(&::curl_global_init_mem) globalInit = nullptr;
  decltype(&::curl_easy_init) easyInit = nullptr;
  decltype(&::curl_easy_cleanup) easyCleanup = nullptr;
  decltype(&::curl_easy_setopt) easySetopt = nullptr;
  decltype(&::curl_easy_getinfo) easyGetinfo = nullptr;
  decltype(&::curl_easy_header) easyHeader = nullptr;
  decltype(&::curl_easy_strerror) easyStrerror = nullptr;
  decltype(&::curl_multi_init) multiInit = nullptr;
  decltype(&::curl_multi_cleanup) multiCleanup = nullptr;
  decltype(&::curl_multi_add_handle) multiAddHandle = nullptr;
  decltype(&::curl_multi_remove_handle) multiRemoveHandle = nullptr;
  decltype(&::curl_multi_poll) multiPoll = nullptr;
  decltype(&::curl_multi_perform) multiPerform = nullptr;
  decltype(&::curl_multi_info_read) multiInfoRead = nullptr;
  decltype(&::curl_url) url = nullptr;
  decltype(&::curl_url_cleanup) urlCleanup = nullptr;
  decltype(&::curl_url_set) urlSet = nullptr;

 private:
  TransferLibrary();
  static const TransferLibrary& instance();

  ErrorSlot error_;
};

}  // namespace platform
