#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/time/PointInTime.h"

namespace platform {

/// The date as XML property lists write it: ISO 8601 in UTC, "2005-05-16T12:30:00Z", by the
/// Gregorian calendar for all times. A fraction of a second is dropped towards the past. The year
/// has four digits at least, more after 9999, and a leading minus before the year 0.
std::string propertyListDate(PointInTime date);

/// The date that such a text names. As the format allows, smaller units may be missing from the
/// right ("2005-05Z"), and a second may have a fraction behind a point or a comma (ISO 8601), of
/// which the milliseconds are kept and the rest is dropped towards the past. A leap second, 60, is
/// the first one of the next minute. Absent for any other text, for a date that no calendar has,
/// and for one that a PointInTime cannot hold.
std::optional<PointInTime> dateFromPropertyListText(std::string_view text);

}  // namespace platform
