#pragma once

#include <unicode/uversion.h>

#include <memory>
#include <string>
#include <string_view>

#include "platform/time/PointInTime.h"
#include "platform/time/TimeZone.h"

U_NAMESPACE_BEGIN
class SimpleDateFormat;
U_NAMESPACE_END

namespace platform {

/// Writes points in time by a pattern of Unicode's date-field symbols (UTS #35), in the locale and
/// the time zone of the process: LC_ALL, LC_TIME or LANG, and TZ, as they are when it is made. The
/// first of the three that is not empty names the locale; without one, and for a locale that nobody
/// knows, dates are written as in the C locale. Zones have no names here: their symbols give the
/// offset that the zone has at the date.
class DateFormatter {
 public:
  explicit DateFormatter(std::string_view pattern);
  /// In another locale, named as those variables name it, and in another zone.
  DateFormatter(std::string_view pattern, std::string_view localeName, TimeZone zone);
  ~DateFormatter();
  DateFormatter(const DateFormatter&) = delete;
  DateFormatter& operator=(const DateFormatter&) = delete;

  std::string format(PointInTime date) const;

 private:
  std::unique_ptr<icu::SimpleDateFormat> format_;  // null when the pattern cannot be used
  TimeZone zone_;
};

}  // namespace platform
