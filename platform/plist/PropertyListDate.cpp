#include "platform/plist/PropertyListDate.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <chrono>
#include <cstddef>
#include <cstdint>

#include "platform/time/CivilDay.h"

namespace platform {
namespace {

using namespace std::chrono_literals;

constexpr std::int64_t kSecondsOfDay = 86400;

std::int64_t daysOfMonth(std::int64_t year, std::int64_t month) {
  const CivilDay next = month == 12 ? CivilDay{year + 1, 1, 1} : CivilDay{year, month + 1, 1};
  return daysFromCivil(next) - daysFromCivil({year, month, 1});
}

void appendPadded(std::string& output, std::int64_t number, std::size_t width) {
  const std::string digits = std::to_string(number);
  output.append(width - std::min(width, digits.size()), '0');
  output += digits;
}

/// Takes the digits at the start of the text away. Absent when they are fewer or more.
std::optional<std::int64_t> takeDigits(std::string_view& text, std::size_t atLeast,
                                       std::size_t atMost) {
  const std::size_t count = std::min(text.find_first_not_of("0123456789"), text.size());
  if (count < atLeast || count > atMost) return std::nullopt;
  std::int64_t number = 0;
  std::from_chars(text.data(), text.data() + count, number);
  text.remove_prefix(count);
  return number;
}

bool takeCharacter(std::string_view& text, char character) {
  if (!text.starts_with(character)) return false;
  text.remove_prefix(1);
  return true;
}

/// Takes a fraction of a second at the start of the text away; absent for a point without digits.
std::optional<std::chrono::milliseconds> takeFraction(std::string_view& text) {
  if (!takeCharacter(text, '.') && !takeCharacter(text, ',')) return 0ms;
  const std::size_t count = std::min(text.find_first_not_of("0123456789"), text.size());
  if (count == 0) return std::nullopt;
  std::chrono::milliseconds fraction{};
  auto unit = 100ms;
  for (const char digit : text.substr(0, count)) {
    fraction += (digit - '0') * unit;
    unit /= 10;  // nothing behind the third digit
  }
  text.remove_prefix(count);
  return fraction;
}

}  // namespace

std::string propertyListDate(PointInTime date) {
  const std::int64_t seconds =
      std::chrono::floor<std::chrono::seconds>(date).time_since_epoch().count();
  const std::int64_t days = floorQuotient(seconds, kSecondsOfDay);
  const std::int64_t secondOfDay = seconds - days * kSecondsOfDay;
  const CivilDay civil = civilFromDays(days);

  std::string output;
  if (civil.year < 0) output += '-';
  appendPadded(output, civil.year < 0 ? -civil.year : civil.year, 4);
  output += '-';
  appendPadded(output, civil.month, 2);
  output += '-';
  appendPadded(output, civil.day, 2);
  output += 'T';
  appendPadded(output, secondOfDay / 3600, 2);
  output += ':';
  appendPadded(output, secondOfDay / 60 % 60, 2);
  output += ':';
  appendPadded(output, secondOfDay % 60, 2);
  output += 'Z';
  return output;
}

std::optional<PointInTime> dateFromPropertyListText(std::string_view text) {
  const bool beforeYearZero = takeCharacter(text, '-');
  // Nine digits reach beyond what a PointInTime holds, and stay far from overflow.
  const auto year = takeDigits(text, 4, 9);
  if (!year) return std::nullopt;

  struct Field {
    char separator;
    std::int64_t first;
    std::int64_t last;
  };
  static constexpr std::array<Field, 5> kFields = {
      {{'-', 1, 12}, {'-', 1, 31}, {'T', 0, 23}, {':', 0, 59}, {':', 0, 60}}};
  std::array<std::int64_t, kFields.size()> values = {1, 1, 0, 0, 0};
  std::size_t i = 0;
  for (; i < kFields.size() && text != "Z"; ++i) {
    if (!takeCharacter(text, kFields[i].separator)) return std::nullopt;
    const auto value = takeDigits(text, 2, 2);
    if (!value || *value < kFields[i].first || *value > kFields[i].last) return std::nullopt;
    values[i] = *value;
  }
  const auto fraction = i == kFields.size() ? takeFraction(text) : 0ms;
  if (!fraction || text != "Z") return std::nullopt;

  const auto [month, day, hour, minute, second] = values;
  const CivilDay civil{beforeYearZero ? -*year : *year, month, day};
  if (day > daysOfMonth(civil.year, month)) return std::nullopt;

  const std::chrono::sys_seconds seconds{std::chrono::seconds(daysFromCivil(civil) * kSecondsOfDay +
                                                              hour * 3600 + minute * 60 + second)};
  constexpr auto kFirst = std::chrono::floor<std::chrono::seconds>(PointInTime::min());
  constexpr auto kLast = std::chrono::floor<std::chrono::seconds>(PointInTime::max());
  if (seconds < kFirst || seconds > kLast) return std::nullopt;
  // The first second is held in part only: its beginning lies before every PointInTime.
  if (seconds == kFirst) return PointInTime::min();
  // And the last one in part.
  const auto room = seconds == kLast ? PointInTime::max() - PointInTime(kLast) : 999ms;
  return PointInTime(seconds) + std::min(*fraction, room);
}

}  // namespace platform
