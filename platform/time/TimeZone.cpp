#include "platform/time/TimeZone.h"

#include <unicode/timezone.h>
#include <unicode/unistr.h>

#include <cstdlib>
#include <ctime>
#include <mutex>

namespace platform {

class TimeZone::Rules {
 public:
  virtual ~Rules() = default;
  virtual std::int64_t offsetAt(PointInTime date) const = 0;
  virtual std::int64_t offsetAtLocalTime(LocalTime time) const = 0;
};

namespace {

/// The rules of a zone of the database.
class DatabaseRules final : public TimeZone::Rules {
 public:
  explicit DatabaseRules(std::unique_ptr<const icu::TimeZone> zone) : zone_(std::move(zone)) {}

  std::int64_t offsetAt(PointInTime date) const override {
    return offset(date.time_since_epoch(), false);
  }
  std::int64_t offsetAtLocalTime(TimeZone::LocalTime time) const override {
    return offset(time.time_since_epoch(), true);
  }

 private:
  std::int64_t offset(PointInTime::duration time, bool isLocalTime) const {
    constexpr std::int64_t kMillisecondsPerSecond = 1000;
    UErrorCode status = U_ZERO_ERROR;
    std::int32_t standard = 0;
    std::int32_t daylight = 0;
    zone_->getOffset(static_cast<UDate>(time.count()), static_cast<UBool>(isLocalTime), standard,
                     daylight, status);
    return (std::int64_t{standard} + daylight) / kMillisecondsPerSecond;
  }

  std::unique_ptr<const icu::TimeZone> zone_;
};

/// The rules that the C library made of TZ or of the system's settings when it last read them.
class CLibraryRules final : public TimeZone::Rules {
 public:
  std::int64_t offsetAt(PointInTime date) const override {
    return offset(std::chrono::floor<std::chrono::seconds>(date.time_since_epoch()));
  }

  std::int64_t offsetAtLocalTime(TimeZone::LocalTime time) const override {
    // Clocks are never more than this ahead of GMT or behind it, nor changed twice within it.
    constexpr std::chrono::hours kFarthestOffset{25};
    const auto seconds = std::chrono::floor<std::chrono::seconds>(time.time_since_epoch());
    const std::int64_t before = offset(seconds - kFarthestOffset);
    const std::int64_t after = offset(seconds + kFarthestOffset);
    // In a gap, the offset after it leads to a time before it; in an overlap, to the later time.
    return offset(seconds - std::chrono::seconds(after)) == after ? after : before;
  }

 private:
  static std::int64_t offset(std::chrono::seconds sinceEpoch) {
    static_assert(sizeof(time_t) == sizeof(std::int64_t));
    const time_t time = sinceEpoch.count();
    struct tm fields {};
    localtime_r(&time, &fields);  // the years of every PointInTime are within those of struct tm
    return fields.tm_gmtoff;
  }
};

using SharedRules = std::shared_ptr<const TimeZone::Rules>;

/// The rules of the zone of the database; null when there is none.
SharedRules databaseRules(std::string_view name) {
  if (name.find('\0') != std::string_view::npos) return nullptr;  // where ICU would stop reading
  // ICU makes a zone of any name: of "GMT+5" an offset, of an unknown one the zone Etc/Unknown.
  const icu::UnicodeString id = icu::UnicodeString::fromUTF8(icu::StringPiece(name));
  icu::UnicodeString canonicalID;
  UBool isInDatabase = 0;
  UErrorCode status = U_ZERO_ERROR;
  icu::TimeZone::getCanonicalID(id, canonicalID, isInDatabase, status);
  if (U_FAILURE(status) != 0 || isInDatabase == 0) return nullptr;
  return std::make_shared<const DatabaseRules>(
      std::unique_ptr<const icu::TimeZone>(icu::TimeZone::createTimeZone(id)));
}

/// A text of TZ that may name a zone of the database: ":name" or a path into the database.
std::string_view zoneName(std::string_view variable) {
  if (variable.starts_with(':')) variable.remove_prefix(1);
  constexpr std::string_view kDatabase = "/zoneinfo/";
  const std::size_t found = variable.find(kDatabase);
  return found == std::string_view::npos ? variable : variable.substr(found + kDatabase.size());
}

/// The rules that TZ means, which is absent when it is not set.
SharedRules localRules(const std::optional<std::string>& variable) {
  // ICU's own database has the names also where none is installed for the C library.
  SharedRules rules = variable ? databaseRules(zoneName(*variable)) : nullptr;
  if (rules) return rules;
  tzset();
  return std::make_shared<const CLibraryRules>();
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
  SharedRules rules = databaseRules(name);
  if (!rules) return std::nullopt;
  return zones.named.emplace(name, TimeZone(std::move(rules))).first->second;
}

TimeZone TimeZone::local() {
  const char* value = std::getenv("TZ");
  Registry& zones = registry();
  const std::lock_guard lock(zones.mutex);
  const bool isCurrent = value != nullptr ? zones.localVariable == std::string_view(value)
                                          : !zones.localVariable.has_value();
  if (!zones.local || !isCurrent) {
    zones.localVariable = value != nullptr ? std::optional<std::string>(value) : std::nullopt;
    zones.local = TimeZone(localRules(zones.localVariable));
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
  return rules_ ? rules_->offsetAt(date) : fixedOffset_;
}

std::int64_t TimeZone::offsetAtLocalTime(LocalTime time) const {
  return rules_ ? rules_->offsetAtLocalTime(time) : fixedOffset_;
}

}  // namespace platform
