#pragma once

#include <string>
#include <system_error>
#include <utility>

#include "platform/text/ErrorRecord.h"

namespace platform {

/// The record of a failed system call, with a cause in words of our own: domain "POSIX", the errno
/// value as the code.
inline ErrorRecord posixError(int code, std::string description) {
  return {"POSIX", code, std::move(description)};
}

/// The same with the system's own words for the code ("No such file or directory").
inline ErrorRecord posixError(int code) {
  return posixError(code, std::generic_category().message(code));
}

}  // namespace platform
