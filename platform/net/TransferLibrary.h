#pragma once

#include <curl/curl.h>

#include <cstddef>
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

 private:
  /// The address of a function of whatever type.
  struct Symbol {
    void* address;
    template <typename Function>
    operator Function*() const {
      return reinterpret_cast<Function*>(address);
    }
  };

  TransferLibrary();
  static const TransferLibrary& instance();
  /// Looks a function up. The first failure becomes the error.
  Symbol find(const char* name);
  /// A function of one of the libraries that this one brings along; null without it.
  static Symbol findIfThere(const char* name);

  ErrorSlot error_;  // before the functions, as finding them fills it

 public:
  decltype(&::curl_global_init_mem) globalInit = find("curl_global_init_mem");
  decltype(&::curl_easy_init) easyInit = find("curl_easy_init");
  decltype(&::curl_easy_cleanup) easyCleanup = find("curl_easy_cleanup");
  decltype(&::curl_easy_setopt) easySetopt = find("curl_easy_setopt");
  decltype(&::curl_easy_getinfo) easyGetinfo = find("curl_easy_getinfo");
  decltype(&::curl_easy_header) easyHeader = find("curl_easy_header");
  decltype(&::curl_easy_strerror) easyStrerror = find("curl_easy_strerror");
  decltype(&::curl_multi_init) multiInit = find("curl_multi_init");
  decltype(&::curl_multi_cleanup) multiCleanup = find("curl_multi_cleanup");
  decltype(&::curl_multi_add_handle) multiAddHandle = find("curl_multi_add_handle");
  decltype(&::curl_multi_remove_handle) multiRemoveHandle = find("curl_multi_remove_handle");
  decltype(&::curl_multi_poll) multiPoll = find("curl_multi_poll");
  decltype(&::curl_multi_perform) multiPerform = find("curl_multi_perform");
  decltype(&::curl_multi_info_read) multiInfoRead = find("curl_multi_info_read");
  decltype(&::curl_slist_append) slistAppend = find("curl_slist_append");
  decltype(&::curl_slist_free_all) slistFreeAll = find("curl_slist_free_all");
  decltype(&::curl_url) url = find("curl_url");
  decltype(&::curl_url_cleanup) urlCleanup = find("curl_url_cleanup");
  decltype(&::curl_url_set) urlSet = find("curl_url_set");

  /// Whether something lies in the session (of OpenSSL, of GnuTLS) that was not taken from it yet.
  int (*openSSLHasPending)(const void* session) = findIfThere("SSL_has_pending");
  std::size_t (*gnuTLSPending)(void* session) = findIfThere("gnutls_record_check_pending");
};

}  // namespace platform
