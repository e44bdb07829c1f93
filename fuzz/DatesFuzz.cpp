#include <chrono>
#include <cstring>
#include <optional>
#include <string>

#include "dates/RFC822Parsing.h"
#include "fuzz/FuzzTarget.h"
#include "platform/plist/PropertyListDate.h"
#include "platform/time/DateFormatter.h"
#include "platform/time/PointInTime.h"

namespace {

using platform::PointInTime;

std::chrono::sys_seconds secondOf(PointInTime date) {
  return std::chrono::floor<std::chrono::seconds>(date);
}

/// That property lists keep every date to the second.
void requireReadsBackFromLists(PointInTime date) {
  const std::string text = platform::propertyListDate(date);
  const std::optional<PointInTime> back = platform::dateFromPropertyListText(text);
  requireThat(back.has_value(), "a date that was written for a property list is one");
  // The first second is held in part only.
  const bool isFirst = secondOf(date) == secondOf(PointInTime::min());
  requireThat(*back == (isFirst ? PointInTime::min() : PointInTime(secondOf(date))),
              "property lists keep dates to the second");
  requireThat(platform::propertyListDate(*back) == text,
              "a property list's date is written as it was read");
}

/// That feeds keep every date to the second that a feed can hold: with a year of our era that is
/// not taken for one of two digits, and not millions of years away.
void requireReadsBackFromFeeds(PointInTime date) {
  static const platform::DateFormatter formatter("EEE, dd MMM yyyy HH:mm:ss ZZZZ");
  static const std::optional<PointInTime> first = platform::dateFromPropertyListText("0100Z");
  static const std::optional<PointInTime> last = platform::dateFromPropertyListText("280000Z");
  const std::string text = formatter.format(date);
  const std::optional<PointInTime> back = dateWithRFC822String(text);
  if (date < *first || date > *last) return;
  requireThat(back.has_value(), "a date that was written for a feed is one");
  requireThat(*back == PointInTime(secondOf(date)), "feeds keep dates to the second");
  requireThat(formatter.format(*back) == text, "a feed's date is written as it was read");
}

void requireReadsBack(PointInTime date) {
  requireReadsBackFromLists(date);
  requireReadsBackFromFeeds(date);
}

}  // namespace

/// Any text as a date of a feed and as one of a property list, and any eight bytes as a point in
/// time: whatever is a date keeps its second when it is written and read.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view text = inputText(data, size);
  if (const auto date = dateWithRFC822String(text)) requireReadsBack(*date);
  if (const auto date = platform::dateFromPropertyListText(text)) requireReadsBack(*date);
  std::int64_t milliseconds = 0;
  if (size == sizeof(milliseconds)) {
    std::memcpy(&milliseconds, data, size);
    requireReadsBack(PointInTime(std::chrono::milliseconds(milliseconds)));
  }

  const std::optional<platform::TimeZone> zone = timeZoneWithMilitaryAbbreviation(text);
  constexpr std::int64_t kHalfDay = 43200;
  requireThat(!zone || (zone->offsetAt({}) >= -kHalfDay && zone->offsetAt({}) <= kHalfDay),
              "military zones are at most twelve hours away");
  return 0;
}
