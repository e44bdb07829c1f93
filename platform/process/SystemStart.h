#pragma once

#include <string>

namespace platform {

/// What tells this start of the operating system from every other one: a line of text, without its
/// end. Empty where the system does not say (Linux does).
std::string systemStart();

}  // namespace platform
