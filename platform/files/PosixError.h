#pragma once

#include <string>

#include "platform/text/ErrorRecord.h"

namespace platform {

/// The record of a failed system call: domain "POSIX", the errno value as the code, and the
/// system's own words for it ("No such file or directory").
ErrorRecord posixError(int code);

/// The same with a cause in words of our own, for what the code does not tell.
ErrorRecord posixError(int code, std::string description);

}  // namespace platform
