#include "platform/time/CivilDay.h"

#include <chrono>

namespace platform {
namespace {

/// After so many years, and days, the calendar repeats itself.
constexpr std::int64_t kYearsPerEra = 400;
constexpr std::int64_t kDaysPerEra = 146097;

}  // namespace

std::int64_t daysFromCivil(const CivilDay& civil) {
  const std::int64_t era = floorQuotient(civil.year, kYearsPerEra);
  const std::chrono::year_month_day day{
      std::chrono::year(static_cast<int>(civil.year - era * kYearsPerEra)),
      std::chrono::month(static_cast<unsigned>(civil.month)),
      std::chrono::day(static_cast<unsigned>(civil.day))};
  return era * kDaysPerEra + std::chrono::sys_days(day).time_since_epoch().count();
}

CivilDay civilFromDays(std::int64_t days) {
  const std::int64_t era = floorQuotient(days, kDaysPerEra);
  const std::chrono::year_month_day day{
      std::chrono::sys_days(std::chrono::days(static_cast<int>(days - era * kDaysPerEra)))};
  return {.year = era * kYearsPerEra + static_cast<int>(day.year()),
          .month = static_cast<unsigned>(day.month()),
          .day = static_cast<unsigned>(day.day())};
}

}  // namespace platform
