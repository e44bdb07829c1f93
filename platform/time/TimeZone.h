#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "platform/time/PointInTime.h"

namespace platform {

/// A time zone: a fixed offset from GMT, or a zone with its daylight-saving rules, of the time-zone
/// database or of TZ. A handle that is cheap to copy and may be shared by threads; zones are made
/// once and reused.
///
///     const std::optional<TimeZone> zone = TimeZone::named("America/New_York");
///     if (!zone) return;     // the database does not have it
///     zone->offsetAt(date);  // -18000 in winter, -14400 in summer
class TimeZone {
 public:
  /// A zone always `seconds` ahead of GMT (behind, when negative).
  static TimeZone withOffset(std::int64_t seconds) {
    return TimeZone([seconds](PointInTime::duration, bool) { return seconds; });
  }
  /// The zone of the database with this name ("America/New_York"); absent when there is none.
  static std::optional<TimeZone> named(std::string_view name);
  /// The zone of the machine, as TZ (now) or without it the system's settings give it. TZ may be
  /// whatever the C library understands: a name, a path of a zone file, or a rule of POSIX
  /// ("CET-1CEST,M3.5.0,M10.5.0/3"); anything else is UTC. A zone that is not of the database is
  /// the C library's own, of which there is one at a time: it lasts until TZ changes to another
  /// such zone and this is called again.
  static TimeZone local();

  /// The process-wide table of zone abbreviations (upper case) to names of the database.
  using AbbreviationTable = std::map<std::string, std::string, std::less<>>;
  static void setAbbreviationTable(const AbbreviationTable& table);
  /// The zone that the process-wide table gives the abbreviation, exactly as written; absent
  /// without an entry. The table is empty until it is set.
  static std::optional<TimeZone> withAbbreviation(std::string_view abbreviation);

  /// What the clocks of a zone show.
  using LocalTime = std::chrono::local_time<PointInTime::duration>;
  /// How many seconds the zone is ahead of GMT at the point in time.
  std::int64_t offsetAt(PointInTime date) const { return offset_(date.time_since_epoch(), false); }
  /// The same when the zone's clocks show the local time. Of a time that they show twice it is the
  /// later one, and one that they skip counts on from before the gap: half past two is half past
  /// three.
  std::int64_t offsetAtLocalTime(LocalTime time) const {
    return offset_(time.time_since_epoch(), true);
  }

 private:
  /// The offset at a time since 1970 by GMT or by the zone's own clocks. No more than a pointer or
  /// a number is captured, so that copies need no memory.
  using Offset = std::function<std::int64_t(PointInTime::duration time, bool isLocalTime)>;

  explicit TimeZone(Offset offset) : offset_(std::move(offset)) {}

  Offset offset_;
};

}  // namespace platform
