#include "dates/RFC822Faults.h"

#include <algorithm>
#include <array>
#include <string>
#include <vector>

#include "platform/text/ASCII.h"
#include "platform/text/Case.h"
#include "platform/text/LeadingInteger.h"
#include "platform/text/Splitting.h"

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

}  // namespace

std::string_view RFC822Fault(std::string_view text) {
  constexpr std::string_view kMonths = "janfebmaraprmayjunjulaugsepoctnovdec";
  constexpr std::size_t kFields = 5;
  const std::vector<std::string_view> fields = platform::splitAtWhitespace(text, kFields + 2);
  if (fields.size() < kFields || fields.size() > kFields + 1) return "it has not all of its parts";
  const std::string_view* const field = fields.data() + (fields.size() - kFields);
  if (!isNumber(field[0], 1, 31)) return "the day is none";
  const std::string month = platform::lowercased(field[1].substr(0, 3));
  const std::size_t found = kMonths.find(month);
  if (month.size() < 3 || found == std::string_view::npos || found % 3 != 0)
    return "the month is not known";
  if (!isNumber(field[2], 0, 9999)) return "the year is none";
  const std::vector<std::string_view> time = platform::splitAt(field[3], ':', 4);
  const bool hasTime = (time.size() == 2 || (time.size() == 3 && isNumber(time[2], 0, 60))) &&
                       isNumber(time[0], 0, 23) && isNumber(time[1], 0, 59);
  if (!hasTime) return "the time is none";
  return isKnownZone(field[4]) ? "" : "the time zone is not known";
}
