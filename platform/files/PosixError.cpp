#include "platform/files/PosixError.h"

#include <system_error>
#include <utility>

namespace platform {

ErrorRecord posixError(int code) {
  return posixError(code, std::generic_category().message(code));
}

ErrorRecord posixError(int code, std::string description) {
  return {"POSIX", code, std::move(description)};
}

}  // namespace platform
