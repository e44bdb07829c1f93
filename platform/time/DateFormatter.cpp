#include "platform/time/DateFormatter.h"

#include <unicode/gregocal.h>
#include <unicode/locid.h>
#include <unicode/simpletz.h>
#include <unicode/smpdtfmt.h>
#include <unicode/uloc.h>
#include <unicode/unistr.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <limits>
#include <utility>

namespace platform {
namespace {

constexpr std::int64_t kMillisecondsPerSecond = 1000;

std::string_view localeVariable() {
  for (const char* name : {"LC_ALL", "LC_TIME", "LANG"}) {
    const char* value = std::getenv(name);
    if (value != nullptr && *value != '\0') return value;
  }
  return {};
}

/// By the names of the locales that there is data for: to have ICU make them all would take longer
/// than to write hundreds of dates.
bool isKnownLanguage(std::string_view language) {
  for (std::int32_t index = uloc_countAvailable(); index > 0; --index) {
    const std::string_view name = uloc_getAvailable(index - 1);
    if (name.substr(0, name.find('_')) == language) return true;
  }
  return false;
}

/// The locale that POSIX names language_TERRITORY.codeset@modifier.
icu::Locale locale(std::string_view name) {
  const std::string_view modifier = name.substr(std::min(name.find('@'), name.size()));
  std::string id(name.substr(0, name.find_first_of(".@")));
  constexpr std::array<std::pair<std::string_view, std::string_view>, 3> kScripts = {
      {{"@latin", "_Latn"}, {"@cyrillic", "_Cyrl"}, {"@devanagari", "_Deva"}}};
  for (const auto& [scriptModifier, script] : kScripts) {
    if (modifier == scriptModifier) id.insert(std::min(id.find('_'), id.size()), script);
  }

  // What ICU makes of a language that it has no data for depends on still other settings.
  const icu::Locale named(id.c_str());
  return isKnownLanguage(named.getLanguage()) ? named : icu::Locale("en_US_POSIX");
}

}  // namespace

DateFormatter::DateFormatter(std::string_view pattern)
    : DateFormatter(pattern, localeVariable(), TimeZone::local()) {}

DateFormatter::DateFormatter(std::string_view pattern, std::string_view localeName, TimeZone zone)
    : zone_(std::move(zone)) {
  UErrorCode status = U_ZERO_ERROR;
  format_ = std::make_unique<icu::SimpleDateFormat>(
      icu::UnicodeString::fromUTF8(icu::StringPiece(pattern)), locale(localeName), status);
  if (U_FAILURE(status) != 0) {
    format_.reset();
    return;
  }
  // The calendars of some locales are not Gregorian, or count their years otherwise; those that
  // are follow the rules of GregorianCalendar before the year 1582 too.
  std::unique_ptr<icu::Calendar> calendar(format_->getCalendar()->clone());
  if (auto* gregorian = dynamic_cast<icu::GregorianCalendar*>(calendar.get())) {
    gregorian->setGregorianChange(std::numeric_limits<UDate>::lowest(), status);
    format_->adoptCalendar(calendar.release());
  }
}

DateFormatter::~DateFormatter() = default;

std::string DateFormatter::format(PointInTime date) const {
  std::string result;
  if (!format_) return result;
  const std::unique_ptr<icu::Calendar> calendar(format_->getCalendar()->clone());
  calendar->adoptTimeZone(new icu::SimpleTimeZone(
      static_cast<std::int32_t>(zone_.offsetAt(date) * kMillisecondsPerSecond), {}));
  UErrorCode status = U_ZERO_ERROR;
  calendar->setTime(static_cast<UDate>(date.time_since_epoch().count()), status);
  icu::UnicodeString text;
  icu::FieldPosition position;
  return format_->format(*calendar, text, position).toUTF8String(result);
}

}  // namespace platform
