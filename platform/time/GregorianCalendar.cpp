#include "platform/time/GregorianCalendar.h"

#include <chrono>

#include "platform/time/CivilDay.h"

namespace platform {
namespace {

using Milliseconds = std::chrono::milliseconds;

constexpr std::int64_t kMonthsPerYear = 12;

/// The farthest from 1970 that ICU's zones and formatters count.
constexpr Milliseconds kFarthest{183'882'168'921'600'000};
/// Far beyond, and near enough to count the days up to it in 64 bits.
constexpr std::int64_t kFarthestYear = 1'000'000'000'000;

/// Makes the number `number` x `factor` + `summand`; false when that takes more than 64 bits.
bool multiplyAndAdd(std::int64_t& number, std::int64_t factor, std::int64_t summand) {
  return !__builtin_mul_overflow(number, factor, &number) &&
         !__builtin_add_overflow(number, summand, &number);
}

}  // namespace

std::optional<PointInTime> GregorianCalendar::dateFromComponents(
    const DateComponents& components) const {
  std::int64_t months = components.year.value_or(1970);
  if (!multiplyAndAdd(months, kMonthsPerYear, components.month.value_or(1)) ||
      !multiplyAndAdd(months, 1, -1)) {
    return std::nullopt;
  }
  const std::int64_t year = floorQuotient(months, kMonthsPerYear);
  if (year < -kFarthestYear || year > kFarthestYear) return std::nullopt;

  std::int64_t count =
      daysFromCivil({.year = year, .month = months - year * kMonthsPerYear + 1, .day = 1});
  if (!multiplyAndAdd(count, 1, components.day.value_or(1)) || !multiplyAndAdd(count, 1, -1) ||
      !multiplyAndAdd(count, 24, components.hour.value_or(0)) ||
      !multiplyAndAdd(count, 60, components.minute.value_or(0)) ||
      !multiplyAndAdd(count, 60, components.second.value_or(0)) ||
      !multiplyAndAdd(count, 1000, 0)) {
    return std::nullopt;
  }

  const std::chrono::local_time<Milliseconds> localTime{Milliseconds(count)};
  const TimeZone& zone = components.timeZone ? *components.timeZone : zone_;
  std::int64_t offset = zone.offsetAtLocalTime(localTime);
  if (!multiplyAndAdd(offset, 1000, 0) || __builtin_sub_overflow(count, offset, &count)) {
    return std::nullopt;
  }
  const PointInTime date{Milliseconds(count)};
  if (date.time_since_epoch() < -kFarthest || date.time_since_epoch() > kFarthest) {
    return std::nullopt;
  }
  return date;
}

std::int64_t GregorianCalendar::currentYear() const {
  const auto now = std::chrono::floor<Milliseconds>(std::chrono::system_clock::now());
  const auto today =
      std::chrono::floor<std::chrono::days>(now + std::chrono::seconds(zone_.offsetAt(now)));
  return static_cast<int>(std::chrono::year_month_day(today).year());
}

}  // namespace platform
