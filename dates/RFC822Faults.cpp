#include "dates/RFC822Faults.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "platform/text/ASCII.h"
#include "platform/text/Case.h"
#include "platform/text/LeadingInteger.h"
#include "platform/text/Splitting.h"
#include "platform/time/CivilDay.h"

namespace {

/// Whether the text is digits alone that make a number from `least` to `most`.
bool isNumber(std::string_view text, std::int64_t least, std::int64_t most) {
  const std::int64_t number = platform::leadingInteger(text);
  return !text.empty() && std::all_of(text.begin(), text.end(), platform::isASCIIDigit) &&
         number >= least && number <= most;
}

bool isKnownZone(std::string_view zone) {
  constexpr std::array<std::string_view, 10> kNames = {"ut",  "gmt", "est", "edt", "cst",
                                                       "cdt", "mst", "mdt", "pst", "pdt"};
  if (zone.starts_with('+') || zone.starts_with('-')) {
    std::string digits(zone.substr(1));
    if (digits.size() == 5 && digits[2] == ':') digits.erase(2, 1);
    return digits.size() == 4 && isNumber(digits, 0, 2359);
  }
  const std::string name = platform::lowercased(zone);
  if (name.size() == 1) return platform::isASCIILetter(name[0]) && name != "j";
  return std::find(kNames.begin(), kNames.end(), name) != kNames.end();
}

/// What is wrong with a day of the calendar, and with the name that stands before it; one that is
/// not English is only a word, which nobody reads.
std::string_view dayFault(std::string_view name, platform::CivilDay day) {
  // From that of 1970-01-01 on.
  constexpr std::array<std::string_view, 7> kFaults = {
      "that day is a Thursday", "that day is a Friday", "that day is a Saturday",
      "that day is a Sunday",   "that day is a Monday", "that day is a Tuesday",
      "that day is a Wednesday"};
  const bool isOfTwoDigits = day.year < 100;
  if (isOfTwoDigits) day.year += 2000;  // in 19xx its months are as long, but for 1900
  const std::int64_t number = platform::daysFromCivil(day);
  if (platform::civilFromDays(number).day != day.day) return "the month has no such day";
  if (isOfTwoDigits) return "";
  const auto beginsWith = [&](std::string_view fault) {
    constexpr std::string_view kBefore = "that day is a ";
    return platform::lowercased(name).starts_with(
        platform::lowercased(fault.substr(kBefore.size(), 3)));
  };
  const std::int64_t weeks = platform::floorQuotient(number, 7);
  const std::string_view right = kFaults.at(static_cast<std::size_t>(number - weeks * 7));
  const bool isDayName = std::any_of(kFaults.begin(), kFaults.end(), beginsWith);
  return isDayName && !beginsWith(right) ? right : "";
}

}  // namespace

std::string_view RFC822Fault(std::string_view text) {
  constexpr std::array<std::string_view, 12> kMonths = {
      "january", "february", "march",     "april",   "may",      "june",
      "july",    "august",   "september", "october", "november", "december"};
  constexpr std::size_t kFields = 5;
  const std::vector<std::string_view> fields = platform::splitAtWhitespace(text, kFields + 2);
  if (fields.size() < kFields || fields.size() > kFields + 1) return "it has not all of its parts";
  const std::string_view* const field = fields.data() + (fields.size() - kFields);
  if (!isNumber(field[0], 1, 31)) return "the day is none";
  const std::string month = platform::lowercased(field[1]);
  const auto* const found = std::find_if(kMonths.begin(), kMonths.end(), [&](auto name) {
    return month.size() >= 3 && name.starts_with(month.substr(0, 3));
  });
  if (found == kMonths.end()) return "the month is not known";
  if (month.size() > 3 && month != *found) return "the month is not written as in RFC 822";
  if (!isNumber(field[2], 0, 9999)) return "the year is none";
  const std::vector<std::string_view> time = platform::splitAt(field[3], ':', 4);
  const bool hasTime = (time.size() == 2 || (time.size() == 3 && isNumber(time[2], 0, 60))) &&
                       isNumber(time[0], 0, 23) && isNumber(time[1], 0, 59);
  if (!hasTime) return "the time is none";
  if (!isKnownZone(field[4])) return "the time zone is not known";
  return dayFault(fields.size() > kFields ? fields.front() : "",
                  {platform::leadingInteger(field[2]), found - kMonths.begin() + 1,
                   platform::leadingInteger(field[0])});
}
