#pragma once

#include "platform/text/ErrorRecord.h"

namespace platform {

/// The record of a failed system call: domain "POSIX", the errno value as the code, and the
/// system's own words for it ("No such file or directory").
ErrorRecord posixError(int code);

}  // namespace platform
