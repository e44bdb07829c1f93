#pragma once

#include <chrono>

namespace platform {

/// An absolute point in time: milliseconds since 1970-01-01 00:00:00 UTC, leap seconds not counted.
using PointInTime = std::chrono::sys_time<std::chrono::milliseconds>;

}  // namespace platform
