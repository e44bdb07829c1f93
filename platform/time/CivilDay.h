#pragma once

#include <cstdint>

namespace platform {

/// A day of the Gregorian calendar, counted by its rules at all times, in any year (those of
/// std::chrono end with 32767). The year before 1 is 0.
struct CivilDay {
  std::int64_t year;
  std::int64_t month;  // 1 to 12
  std::int64_t day;    // from 1
};

/// The days from 1970-01-01 to the day; exact for years up to 10^16 either way.
std::int64_t daysFromCivil(const CivilDay& civil);

/// The day that lies so many days after 1970-01-01.
CivilDay civilFromDays(std::int64_t days);

/// The quotient rounded towards the past; the divisor is positive.
constexpr std::int64_t floorQuotient(std::int64_t dividend, std::int64_t divisor) {
  return dividend / divisor - (dividend % divisor < 0 ? 1 : 0);
}

}  // namespace platform
