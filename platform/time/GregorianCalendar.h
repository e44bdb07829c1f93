#pragma once

#include <cstdint>
#include <optional>
#include <utility>

#include "platform/time/PointInTime.h"
#include "platform/time/TimeZone.h"

namespace platform {

/// The parts of a date; absent ones are taken from 1970-01-01 00:00:00. Any field may lie out of
/// its range: day 32 of January is the first of February, hour 25 is one o'clock of the next day,
/// month 13 is January of the next year. The year before 1 is 0.
struct DateComponents {
  std::optional<std::int64_t> year;
  std::optional<std::int64_t> month;  // from 1
  std::optional<std::int64_t> day;
  std::optional<std::int64_t> hour;
  std::optional<std::int64_t> minute;
  std::optional<std::int64_t> second;
  std::optional<TimeZone> timeZone;  // instead of the calendar's
};

/// The Gregorian calendar in one time zone, cheap to make. Its rules hold for all times, those
/// before its introduction included, as they do for the dates of ISO 8601.
class GregorianCalendar {
 public:
  explicit GregorianCalendar(TimeZone zone = TimeZone::local()) : zone_(std::move(zone)) {}

  /// The point in time of the components; absent when it lies outside what the calendar can count,
  /// some five million years before and after now.
  std::optional<PointInTime> dateFromComponents(const DateComponents& components) const;

  /// The year of now.
  std::int64_t currentYear() const;

 private:
  TimeZone zone_;
};

}  // namespace platform
