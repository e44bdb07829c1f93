#pragma once

#include <optional>
#include <string_view>

#include "platform/time/PointInTime.h"
#include "platform/time/TimeZone.h"

/// The point in time of an RFC 822 date-time text, as feeds give them: "Tue, 05 Jun 2007 14:30:00
/// PDT", with or without the day name and the seconds.
///
/// The text is read by position, and leniently: fields are divided by single white-space
/// characters, what is no number reads 0, an unknown month is January, an unknown zone the local
/// one, and numbers out of range carry over (day 32 of May is the first of June). A year below 100
/// is one of the hundred years up to the current one. The zone is a signed offset (+0200, -05:30),
/// a military letter, or one of UT, GMT, EST, EDT, CST, CDT, MST, MDT, PST and PDT; the American
/// ones stand for a region, whose own rules decide about daylight saving time.
///
/// Absent for an absent text, for one that has not 5 or 6 fields, for a time without ":", for a
/// signed zone with only one character behind the sign, and for a date millions of years away.
std::optional<platform::PointInTime> dateWithRFC822String(std::optional<std::string_view> text);

/// The zone of a military letter in either case, with the signs of RFC 822: A is one hour behind
/// GMT, N one hour ahead, Z is UTC. Any other character, J included, is GMT. Absent for an absent
/// text and for one that is not exactly one character long.
std::optional<platform::TimeZone> timeZoneWithMilitaryAbbreviation(
    std::optional<std::string_view> text);
