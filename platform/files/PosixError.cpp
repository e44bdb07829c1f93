#include "platform/files/PosixError.h"

#include <system_error>

namespace platform {

ErrorRecord posixError(int code) {
  return {"POSIX", code, std::generic_category().message(code)};
}

}  // namespace platform
