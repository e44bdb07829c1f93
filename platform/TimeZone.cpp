#include "platform/TimeZone.h"

#include <unicode/simpletz.h>
#include <unicode/unistr.h>

#include <cstdlib>
#include <ctime>
#include <mutex>

#include "platform/TimeZoneImplementation.h"

namespace platform {
namespace {

constexpr std::int64_t kMillisecondsPerSecond = 1000;

icu::UnicodeString unicodeString(std::string_view text) {
  return icu::UnicodeString::fromUTF8(icu::StringPiece(text));
}

std::int64_t offsetOf(const icu::TimeZone& zone, std::int64_t milliseconds, bool isLocalTime) {
  UErrorCode status = U_ZERO_ERROR;
  std::int32_t standard = 0;
  std::int32_t daylight = 0;
  zone.getOffset(static_cast<UDate>(milliseconds), static_cast<UBool>(isLocalTime), standard,
                 daylight, status);
  return (std::int64_t{standard} + daylight) / kMillisecondsPerSecond;
}

/// The zone of the database; null when there is none.
std::unique_ptr<const icu::TimeZone> databaseZone(std::string_view name) {
  if (name.find('\0') != std::string_view::npos) return nullptr;  // where ICU would stop reading
  // ICU makes a zone of any name: of "GMT+5" an offset, of an unknown one the zone Etc/Unknown.
  const icu::UnicodeString id = unicodeString(name);
  icu::UnicodeString canonicalID;
  UBool isInDatabase = 0;
  UErrorCode status = U_ZERO_ERROR;
  icu::TimeZone::getCanonicalID(id, canonicalID, isInDatabase, status);
  if (U_FAILURE(status) != 0 || isInDatabase == 0 || canonicalID == UCAL_UNKNOWN_ZONE_ID) {
    return nullptr;
  }
  return std::unique_ptr<const icu::TimeZone>(icu::TimeZone::createTimeZone(id));
}

/// A text of TZ that may name a zone of the database: ":name" or a path into the database.
std::string_view zoneName(std::string_view variable) {
  if (variable.starts_with(':')) variable.remove_prefix(1);
  constexpr std::string_view kDatabase = "/zoneinfo/";
  const std::size_t found = variable.find(kDatabase);
  return found == std::string_view::npos ? variable : variable.substr(found + kDatabase.size());
}

/// The zone that the C library makes of TZ, with its present offset for all times.
std::unique_ptr<const icu::TimeZone> zoneOfCLibrary() {
  tzset();
  const time_t now = time(nullptr);
  struct tm local {};
  const std::int64_t offset = localtime_r(&now, &local) != nullptr ? local.tm_gmtoff : 0;
  return std::make_unique<const icu::SimpleTimeZone>(
      static_cast<std::int32_t>(offset * kMillisecondsPerSecond), unicodeString("Local"));
}

/// The zones in use by name, and the table of abbreviations.
struct Registry {
  std::mutex mutex;
  std::map<std::string, TimeZone, std::less<>> named;
  std::optional<std::string> localVariable;
  std::optional<TimeZone> local;
  TimeZone::AbbreviationTable abbreviations;
};

Registry& registry() {
  static Registry instance;
  return instance;
}

}  // namespace

TimeZone TimeZone::withOffset(std::int64_t seconds) {
  return TimeZone(seconds);
}

std::optional<TimeZone> TimeZone::named(std::string_view name) {
  Registry& zones = registry();
  const std::lock_guard lock(zones.mutex);
  if (const auto known = zones.named.find(name); known != zones.named.end()) return known->second;
  std::unique_ptr<const icu::TimeZone> zone = databaseZone(name);
  if (!zone) return std::nullopt;
  return zones.named
      .emplace(name, TimeZone(std::make_shared<const Implementation>(std::move(zone))))
      .first->second;
}

TimeZone TimeZone::local() {
  const char* value = std::getenv("TZ");
  Registry& zones = registry();
  const std::lock_guard lock(zones.mutex);
  const bool isCurrent = value != nullptr ? zones.localVariable == std::string_view(value)
                                          : !zones.localVariable.has_value();
  if (!zones.local || !isCurrent) {
    std::unique_ptr<const icu::TimeZone> zone;
    if (value == nullptr) {
      zones.localVariable.reset();
      zone.reset(icu::TimeZone::detectHostTimeZone());
    } else {
      zones.localVariable = value;
      zone = databaseZone(zoneName(value));
    }
    if (!zone) zone = zoneOfCLibrary();
    zones.local = TimeZone(std::make_shared<const Implementation>(std::move(zone)));
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
  std::string name;
  {
    const std::lock_guard lock(zones.mutex);
    const auto entry = zones.abbreviations.find(abbreviation);
    if (entry == zones.abbreviations.end()) return std::nullopt;
    name = entry->second;
  }
  return named(name);
}

std::int64_t TimeZone::offsetAt(PointInTime date) const {
  if (!implementation_) return fixedOffset_;
  return offsetOf(implementation_->zone(), date.time_since_epoch().count(), false);
}

std::int64_t TimeZone::offsetAtLocalTime(
    std::chrono::local_time<PointInTime::duration> time) const {
  if (!implementation_) return fixedOffset_;
  return offsetOf(implementation_->zone(), time.time_since_epoch().count(), true);
}

}  // namespace platform
