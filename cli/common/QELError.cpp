#include "cli/common/QELError.h"

#include <utility>

platform::ErrorRecord QELError(std::int64_t code, std::string description) {
  return {"QELDomain", code, std::move(description)};
}
