#include "dates/RFC822Parsing.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <string>
#include <vector>

#include "platform/text/Case.h"
#include "platform/text/Characters.h"
#include "platform/text/LeadingInteger.h"
#include "platform/text/Splitting.h"
#include "platform/time/GregorianCalendar.h"

namespace {

const platform::TimeZone::AbbreviationTable& namedZones() {
  static const platform::TimeZone::AbbreviationTable table = {
      {"UT", "UTC"},
      {"GMT", "GMT"},
      {"EST", "America/New_York"},
      {"EDT", "America/New_York"},
      {"CST", "America/Chicago"},
      {"CDT", "America/Chicago"},
      {"MST", "America/Denver"},
      {"MDT", "America/Denver"},
      {"PST", "America/Los_Angeles"},
      {"PDT", "America/Los_Angeles"},
  };
  return table;
}

std::int64_t monthNumber(std::string_view field) {
  constexpr std::array<std::string_view, 12> kMonths = {"jan", "feb", "mar", "apr", "may", "jun",
                                                        "jul", "aug", "sep", "oct", "nov", "dec"};
  const std::string name = platform::lowercased(field);
  const auto* month = std::find_if(kMonths.begin(), kMonths.end(), [&](std::string_view prefix) {
    return name.starts_with(prefix);
  });
  return month == kMonths.end() ? 1 : month - kMonths.begin() + 1;
}

std::int64_t yearNumber(std::string_view field, const platform::GregorianCalendar& calendar) {
  const std::int64_t year = platform::leadingInteger(field);
  if (year >= 100) return year;
  return year > calendar.currentYear() - 2000 ? 1900 + year : 2000 + year;
}

/// The seconds of a zone such as "+0530" or "-05:30"; absent without two characters for the hours.
std::optional<std::int64_t> signedOffset(std::string_view zone) {
  std::string digits(zone.substr(1));
  const std::size_t length = platform::characterCount(digits);
  if (length < 2) return std::nullopt;
  if (const std::size_t colon = digits.find(':'); length == 5 && colon != std::string::npos) {
    digits.erase(colon, 1);
  }
  const std::string_view hourDigits = platform::firstCharacters(digits, 2);
  const std::int64_t hours = platform::leadingInteger(hourDigits);
  // Enough for any date to end up where no calendar counts, and too few to overflow.
  constexpr std::int64_t kMostMinutes = 1'000'000'000'000'000;
  const std::int64_t minutes =
      std::clamp(platform::leadingInteger(std::string_view(digits).substr(hourDigits.size())),
                 -kMostMinutes, kMostMinutes);
  const std::int64_t seconds = (hours * 60 + minutes) * 60;
  return zone.starts_with('-') ? -seconds : seconds;
}

}  // namespace

std::optional<platform::PointInTime> dateWithRFC822String(std::optional<std::string_view> text) {
  if (!text) return std::nullopt;
  constexpr std::size_t kFields = 5;  // a day name may stand before them
  const std::vector<std::string_view> fields = platform::splitAtWhitespace(*text, kFields + 2);
  if (fields.size() != kFields && fields.size() != kFields + 1) return std::nullopt;
  const std::string_view* field = fields.data() + (fields.size() - kFields);

  platform::GregorianCalendar calendar;
  platform::DateComponents components;
  components.day = platform::leadingInteger(field[0]);
  components.month = monthNumber(field[1]);
  components.year = yearNumber(field[2], calendar);

  const std::vector<std::string_view> time = platform::splitAt(field[3], ':', 4);
  if (time.size() < 2) return std::nullopt;
  components.hour = platform::leadingInteger(time[0]);
  components.minute = platform::leadingInteger(time[1]);
  if (time.size() == 3) components.second = platform::leadingInteger(time[2]);

  const std::string zone = platform::uppercased(field[4]);
  if (platform::characterCount(zone) == 1) {
    components.timeZone = timeZoneWithMilitaryAbbreviation(zone);
  } else if (zone.starts_with('+') || zone.starts_with('-')) {
    const std::optional<std::int64_t> offset = signedOffset(zone);
    if (!offset) return std::nullopt;
    components.timeZone = platform::TimeZone::withOffset(*offset);
  } else {
    platform::TimeZone::setAbbreviationTable(namedZones());
    components.timeZone = platform::TimeZone::withAbbreviation(zone);
  }
  return calendar.dateFromComponents(components);
}

std::optional<platform::TimeZone> timeZoneWithMilitaryAbbreviation(
    std::optional<std::string_view> text) {
  if (!text || platform::characterCount(*text) != 1) return std::nullopt;
  const auto hours = [](std::int64_t count) {
    return platform::TimeZone::withOffset(count * 3600);
  };
  const platform::TimeZone greenwich = hours(0);
  const std::string upper = platform::uppercased(*text);
  const char letter = upper.size() == 1 ? upper.front() : '\0';
  if (letter == 'Z') return platform::TimeZone::named("UTC").value_or(greenwich);
  if (letter >= 'A' && letter <= 'I') return hours('A' - 1 - letter);
  if (letter >= 'K' && letter <= 'M') return hours('A' - letter);
  if (letter >= 'N' && letter <= 'Y') return hours(letter - 'N' + 1);
  return greenwich;
}
