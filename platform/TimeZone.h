#pragma once

#include <chrono>
#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "platform/PointInTime.h"

namespace platform {

/// A time zone: a fixed offset from GMT, or a zone of the time-zone database with its
/// daylight-saving rules. A handle that is cheap to copy; zones are made once and reused.
class TimeZone {
 public:
  /// A zone always `seconds` ahead of GMT (behind, when negative).
  static TimeZone withOffset(std::int64_t seconds);
  /// The zone of the database with this name ("America/New_York"); absent when there is none.
  static std::optional<TimeZone> named(std::string_view name);
  /// The zone of the machine, as TZ (now) or the system's settings give it. A TZ that is a rule
  /// instead of a name counts as the offset that it has now, one that is neither as UTC.
  static TimeZone local();

  /// The process-wide table of zone abbreviations (upper case) to names of the database.
  using AbbreviationTable = std::map<std::string, std::string, std::less<>>;
  static void setAbbreviationTable(const AbbreviationTable& table);
  /// The zone that the process-wide table gives the abbreviation, exactly as written; absent
  /// without an entry. The table is empty until it is set.
  static std::optional<TimeZone> withAbbreviation(std::string_view abbreviation);

  /// How many seconds the zone is ahead of GMT at the point in time.
  std::int64_t offsetAt(PointInTime date) const;
  /// The same when the zone's clocks show the local time. Of a time that they show twice it is the
  /// later one, and one that they skip counts on from before the gap: half past two is half past
  /// three.
  std::int64_t offsetAtLocalTime(std::chrono::local_time<PointInTime::duration> time) const;

  /// ICU's view of the zone; null for a fixed offset.
  class Implementation;
  const Implementation* implementation() const { return implementation_.get(); }

 private:
  explicit TimeZone(std::int64_t fixedOffset) : fixedOffset_(fixedOffset) {}
  explicit TimeZone(std::shared_ptr<const Implementation> implementation)
      : implementation_(std::move(implementation)) {}

  std::int64_t fixedOffset_ = 0;
  std::shared_ptr<const Implementation> implementation_;
};

}  // namespace platform
