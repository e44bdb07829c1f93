#pragma once

#include <cstdint>
#include <memory>
#include <optional>

#include "platform/PointInTime.h"
#include "platform/TimeZone.h"

namespace platform {

/// The parts of a date; those that are absent count as the calendar's default (second 0). Any field
/// may lie out of its range: day 32 of January is the first of February, hour 25 is one o'clock of
/// the next day, month 13 is January of the next year.
struct DateComponents {
  std::optional<std::int64_t> year;
  std::optional<std::int64_t> month;  // from 1
  std::optional<std::int64_t> day;
  std::optional<std::int64_t> hour;
  std::optional<std::int64_t> minute;
  std::optional<std::int64_t> second;
  std::optional<TimeZone> timeZone;  // instead of the calendar's
};

/// The Gregorian calendar in one time zone.
class GregorianCalendar {
 public:
  /// In the local time zone.
  GregorianCalendar();
  ~GregorianCalendar();
  GregorianCalendar(const GregorianCalendar&) = delete;
  GregorianCalendar& operator=(const GregorianCalendar&) = delete;

  void setTimeZone(const TimeZone& zone);

  /// The point in time of the components; absent when it lies outside what the calendar can count.
  std::optional<PointInTime> dateFromComponents(const DateComponents& components);

  /// The year of now.
  std::int64_t currentYear();

 private:
  class Implementation;
  std::unique_ptr<Implementation> implementation_;
};

}  // namespace platform
