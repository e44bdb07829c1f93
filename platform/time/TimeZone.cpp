#include "platform/time/TimeZone.h"

#include <unicode/timezone.h>
#include <unicode/unistr.h>

#include <cstdlib>
#include <ctime>
#include <memory>
#include <mutex>

namespace platform {

namespace {

using Duration = PointInTime::duration;

/// The offset by the rules of a zone of the database.
std::int64_t databaseOffset(const icu::TimeZone& zone, Duration time, bool isLocalTime) {
  constexpr std::int64_t kMillisecondsPerSecond = 1000;
  UErrorCode status = U_ZERO_ERROR;
  std::int32_t standard = 0;
  std::int32_t daylight = 0;
  zone.getOffset(static_cast<UDate>(time.count()), static_cast<UBool>(isLocalTime), standard,
                 daylight, status);
  return (std::int64_t{standard} + daylight) / kMillisecondsPerSecond;
}

/// The offset by the rules that the C library made of TZ or of the system's settings when it last
/// read them.
std::int64_t libraryOffset(Duration time, bool isLocalTime) {
  const auto offsetAt = [](std::chrono::seconds sinceEpoch) {
    static_assert(sizeof(time_t) == sizeof(std::int64_t));
    const time_t date = sinceEpoch.count();
    struct tm fields {};
    localtime_r(&date, &fields);  // the years of every PointInTime are within those of struct tm
    return std::int64_t{fields.tm_gmtoff};
  };
  const auto seconds = std::chrono::floor<std::chrono::seconds>(time);
  if (!isLocalTime) return offsetAt(seconds);
  // Clocks are never more than this ahead of GMT or behind it, nor changed twice within it.
  constexpr std::chrono::hours kFarthestOffset{25};
  const std::int64_t before = offsetAt(seconds - kFarthestOffset);
  const std::int64_t after = offsetAt(seconds + kFarthestOffset);
  // In a gap, the offset after it leads to a time before it; in an overlap, to the later time.
  return offsetAt(seconds - std::chrono::seconds(after)) == after ? after : before;
}

/// The zone of the database; null when there is none.
std::unique_ptr<const icu::TimeZone> databaseZone(std::string_view name) {
  constexpr std::size_t kLongestName = 255;  // those of the database have a few dozen characters
  if (name.size() > kLongestName) return nullptr;
  if (name.find('\0') != std::string_view::npos) return nullptr;  // where ICU would stop reading
  // ICU makes a zone of any name: of "GMT+5" an offset, of an unknown one the zone Etc/Unknown.
  const icu::UnicodeString id = icu::UnicodeString::fromUTF8(icu::StringPiece(name));
  icu::UnicodeString canonicalID;
  UBool isInDatabase = 0;
  UErrorCode status = U_ZERO_ERROR;
  icu::TimeZone::getCanonicalID(id, canonicalID, isInDatabase, status);
  if (U_FAILURE(status) != 0 || isInDatabase == 0) return nullptr;
  return std::unique_ptr<const icu::TimeZone>(icu::TimeZone::createTimeZone(id));
}

/// A text of TZ that may name a zone of the database: ":name" or a path into the database.
std::string_view zoneName(std::string_view variable) {
  if (variable.starts_with(':')) variable.remove_prefix(1);
  constexpr std::string_view kDatabase = "/zoneinfo/";
  const std::size_t found = variable.find(kDatabase);
  return found == std::string_view::npos ? variable : variable.substr(found + kDatabase.size());
}

/// The zones of the database in use by name, the local one, and the table of abbreviations.
struct Registry {
  std::recursive_mutex mutex;
  std::map<std::string, std::unique_ptr<const icu::TimeZone>, std::less<>> named;
  std::optional<std::string> localVariable;
  std::optional<TimeZone> local;
  TimeZone::AbbreviationTable abbreviations;
};

Registry& registry() {
  static Registry instance;
  return instance;
}

}  // namespace

std::optional<TimeZone> TimeZone::named(std::string_view name) {
  Registry& zones = registry();
  const std::lock_guard lock(zones.mutex);
  auto known = zones.named.find(name);
  if (known == zones.named.end()) {
    std::unique_ptr<const icu::TimeZone> made = databaseZone(name);
    if (!made) return std::nullopt;
    known = zones.named.emplace(name, std::move(made)).first;
  }
  return TimeZone([zone = known->second.get()](Duration time, bool isLocalTime) {
    return databaseOffset(*zone, time, isLocalTime);
  });
}

TimeZone TimeZone::local() {
  const char* value = std::getenv("TZ");
  std::optional<std::string> variable;
  if (value != nullptr) variable = value;
  Registry& zones = registry();
  const std::lock_guard lock(zones.mutex);
  if (!zones.local || zones.localVariable != variable) {
    zones.localVariable = variable;
    // ICU's own database has the names also where none is installed for the C library.
    zones.local = variable ? named(zoneName(*variable)) : std::nullopt;
    if (!zones.local) {
      tzset();
      zones.local = TimeZone(&libraryOffset);
    }
  }
  return *zones.local;
}

void TimeZone::setAbbreviationTable(const AbbreviationTable& table) {
  Registry& zones = registry();
  const std::lock_guard lock(zones.mutex);
  if (zones.abbreviations != table) zones.abbreviations = table;
}

std::optional<TimeZone> TimeZone::withAbbreviation(std::string_view abbreviation) {
  Registry& zones = registry();
  const std::lock_guard lock(zones.mutex);
  const auto entry = zones.abbreviations.find(abbreviation);
  return entry != zones.abbreviations.end() ? named(entry->second) : std::nullopt;
}

}  // namespace platform
