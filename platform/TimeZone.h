#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace platform {

/// A time zone: a fixed offset from GMT, or a zone of the time-zone database with its
/// daylight-saving rules. A handle that is cheap to copy; zones are made once and reused.
class TimeZone {
 public:
  /// A zone always `seconds` ahead of GMT (behind, when negative).
  static TimeZone withOffset(std::int64_t seconds);
  /// The zone of the database with this name ("America/New_York"); absent when there is none.
  static std::optional<TimeZone> named(std::string_view name);
  /// The zone of the machine, as TZ or the system's settings give it.
  static TimeZone local();

  /// The process-wide table of zone abbreviations (upper case) to names of the database.
  using AbbreviationTable = std::map<std::string, std::string, std::less<>>;
  static void setAbbreviationTable(const AbbreviationTable& table);
  /// The zone that the process-wide table gives the abbreviation, exactly as written; absent
  /// without an entry. The table is empty until it is set.
  static std::optional<TimeZone> withAbbreviation(std::string_view abbreviation);

  class Implementation;
  const Implementation& implementation() const { return *implementation_; }

 private:
  explicit TimeZone(std::shared_ptr<const Implementation> implementation)
      : implementation_(std::move(implementation)) {}
  std::shared_ptr<const Implementation> implementation_;
};

}  // namespace platform
