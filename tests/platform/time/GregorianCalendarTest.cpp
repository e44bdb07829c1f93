#include "platform/time/GregorianCalendar.h"

#include <gtest/gtest.h>

#include <chrono>
#include <limits>
#include <vector>

#include "tests/support/EnvironmentGuard.h"

namespace {

using platform::DateComponents;
using platform::GregorianCalendar;
using platform::PointInTime;
using platform::TimeZone;
using std::chrono::seconds;

constexpr std::int64_t kMax = std::numeric_limits<std::int64_t>::max();
constexpr std::int64_t kMin = std::numeric_limits<std::int64_t>::min();

DateComponents components(std::int64_t year, std::int64_t month, std::int64_t day,
                          std::int64_t hour = 0, std::int64_t minute = 0, std::int64_t second = 0) {
  return {year, month, day, hour, minute, second, TimeZone::withOffset(0)};
}

std::optional<PointInTime> instant(std::int64_t secondsSince1970) {
  return PointInTime(seconds(secondsSince1970));
}

TEST(GregorianCalendarTest, CountsAndCarriesOver) {
  const struct {
    const char* name;
    DateComponents fields;
    std::int64_t expected;
  } rows[] = {
      {"the epoch", components(1970, 1, 1), 0},
      {"an afternoon", components(2007, 6, 5, 21, 30, 0), 1181079000},
      {"a leap day", components(2000, 2, 29), 951782400},
      {"no leap day", components(1900, 2, 29), -2203891200},
      {"month 13", components(2007, 13, 1), 1199145600},
      {"month 0", components(2008, 0, 1), 1196467200},
      {"month -11", components(2008, -11, 1), 1167609600},
      {"month 121", components(1998, 121, 1), 1199145600},
      {"day 32", components(2007, 1, 32), 1170288000},
      {"day 0", components(2007, 3, 0), 1172620800},
      {"day -30", components(2007, 2, -30), 1167609600},
      {"day 31 of June", components(2007, 6, 31), 1183248000},
      {"hour 25", components(2007, 1, 1, 25), 1167699600},
      {"hour -1", components(2007, 1, 1, -1), 1167606000},
      {"minute 60", components(2007, 1, 1, 0, 60), 1167613200},
      {"second 60", components(2007, 1, 1, 0, 0, 60), 1167609660},
      {"seconds of a year", components(2007, 1, 1, 0, 0, 31536000), 1199145600},
      {"a day far away and back", components(1970, 1, 1 + 1'000'000'000, -24'000'000'000), 0},
      {"the year before 1583", components(1582, 10, 10), -12219724800},
      {"year 107", components(107, 6, 5), -58777228800},
      {"year 1", components(1, 1, 1), -62135596800},
      {"year 0", components(0, 12, 31), -62135683200},
      {"year -1", components(-1, 1, 1), -62198755200},
      {"year -400", components(-400, 3, 1), -74784816000},
      {"year 9999", components(9999, 12, 31, 23, 59, 59), 253402300799},
      {"year 30000", components(30000, 1, 1), 884541340800},
      {"year 5000000", components(5'000'000, 1, 1), 157722592780800},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(GregorianCalendar().dateFromComponents(row.fields), instant(row.expected))
        << row.name;
  }
}

TEST(GregorianCalendarTest, AgreesWithTheCalendarOfTheLibraryOnEveryDay) {
  using std::chrono::sys_days;
  using std::chrono::year;
  for (auto day = sys_days(year(-801) / 1 / 1); day < sys_days(year(2801) / 1 / 1);
       day += std::chrono::days(1)) {
    const std::chrono::year_month_day date(day);
    const auto fields =
        components(static_cast<int>(date.year()), unsigned{date.month()}, unsigned{date.day()});
    ASSERT_EQ(GregorianCalendar().dateFromComponents(fields), PointInTime(day))
        << day.time_since_epoch().count();
  }
}

TEST(GregorianCalendarTest, AbsentFieldsCountAsTheStartOf1970) {
  DateComponents fields;
  fields.timeZone = TimeZone::withOffset(0);
  EXPECT_EQ(GregorianCalendar().dateFromComponents(fields), instant(0));
  fields.year = 2007;
  EXPECT_EQ(GregorianCalendar().dateFromComponents(fields), instant(1167609600));
}

TEST(GregorianCalendarTest, WhatTheCalendarCannotCountIsAbsent) {
  const DateComponents accepted[] = {
      components(5'828'000, 1, 1),
      components(-5'824'000, 1, 1),
      components(1970, 1, 1, 0, 0, 183'882'168'921'600),
      components(1970, 1, 1, 0, 0, -183'882'168'921'600),
  };
  for (const auto& fields : accepted) {
    EXPECT_TRUE(GregorianCalendar().dateFromComponents(fields)) << *fields.year;
  }
  const DateComponents rejected[] = {
      components(6'000'000, 1, 1),
      components(-6'000'000, 1, 1),
      components(99'999'999'999, 1, 1),
      components(1970, 1, 1, 0, 0, 183'882'168'921'601),
      components(1970, 1, 1, 0, 0, -183'882'168'921'601),
      // 2^31, 2^32 and more of anything must not come back as a date that looks right.
      components(std::int64_t{1} << 32, 1, 1),
      components(1970, std::int64_t{1} << 32, 1),
      components(1970, 1, (std::int64_t{1} << 32)),
      components(1970, 1, kMin),
      components(1970, 1, 1, std::int64_t{1} << 40),
      components(1970, 1, 1, 0, std::int64_t{1} << 44),
      components(1970, 1, 1, 0, 0, std::int64_t{1} << 50),
  };
  for (const auto& fields : rejected) {
    EXPECT_FALSE(GregorianCalendar().dateFromComponents(fields))
        << *fields.year << " " << *fields.month << " " << *fields.day << " " << *fields.hour;
  }
}

TEST(GregorianCalendarTest, ZoneThatLeadsBeyondWhatCanBeCountedIsAbsent) {
  for (const std::int64_t sign : {1, -1}) {
    DateComponents fields = components(1970, 1, 1, 0, 0, sign * 9'223'372'036'854'775);
    fields.timeZone = TimeZone::withOffset(-sign * 1'000'000'000'000);
    EXPECT_FALSE(GregorianCalendar().dateFromComponents(fields)) << sign;
  }
}

TEST(GregorianCalendarTest, LargeFieldsThatTheCalendarCanCountAreExact) {
  EXPECT_EQ(GregorianCalendar().dateFromComponents(components(1970, 1, 1, 0, 0, 1LL << 32)),
            instant(1LL << 32));
  EXPECT_EQ(GregorianCalendar().dateFromComponents(components(1970, 1, 1, 0, 1LL << 32)),
            instant((1LL << 32) * 60));
  EXPECT_EQ(GregorianCalendar().dateFromComponents(components(1970, 1, 1, 1LL << 32)),
            instant((1LL << 32) * 3600));
  EXPECT_EQ(GregorianCalendar().dateFromComponents(components(1970, 1, (1LL << 30) + 1)),
            instant((1LL << 30) * 86400));
}

TEST(GregorianCalendarTest, ExtremesOfEveryFieldAreTakenWithoutFault) {
  const std::vector<std::int64_t> extremes = {kMin, kMin + 1, -1, 0, 1, kMax - 1, kMax};
  for (const std::int64_t year : extremes) {
    for (const std::int64_t month : extremes) {
      for (const std::int64_t day : extremes) {
        for (const std::int64_t time : extremes) {
          auto fields = components(year, month, day, time, time, time);
          fields.timeZone = TimeZone::withOffset(time);
          const bool isExtreme = std::abs(year / 2) > 1 || std::abs(month / 2) > 1 ||
                                 std::abs(day / 2) > 1 || std::abs(time / 2) > 1;
          EXPECT_EQ(GregorianCalendar().dateFromComponents(fields).has_value(), !isExtreme)
              << year << " " << month << " " << day << " " << time;
        }
      }
    }
  }
}

TEST(GregorianCalendarTest, ZoneOfTheComponentsGoesBeforeThatOfTheCalendar) {
  const EnvironmentGuard guard("TZ", "Europe/Berlin");
  DateComponents fields = components(2007, 6, 5, 12);
  fields.timeZone.reset();
  EXPECT_EQ(GregorianCalendar().dateFromComponents(fields), instant(1181037600));
  const GregorianCalendar calendar(*TimeZone::named("America/Los_Angeles"));
  EXPECT_EQ(calendar.dateFromComponents(fields), instant(1181070000));
  fields.timeZone = TimeZone::withOffset(9540);
  EXPECT_EQ(calendar.dateFromComponents(fields), instant(1181035260));
}

TEST(GregorianCalendarTest, ClocksThatAreSetForwardAndBack) {
  const EnvironmentGuard guard("TZ", "America/Los_Angeles");
  const struct {
    const char* name;
    DateComponents fields;
    std::int64_t expected;
  } rows[] = {
      {"before the gap", components(2007, 3, 11, 1, 59, 59), 1173607199},
      {"in the gap", components(2007, 3, 11, 2, 30), 1173609000},
      {"behind the gap", components(2007, 3, 11, 3), 1173607200},
      {"before the overlap", components(2007, 11, 4, 0, 59, 59), 1194163199},
      {"in the overlap", components(2007, 11, 4, 1, 30), 1194168600},
      {"behind the overlap", components(2007, 11, 4, 2), 1194170400},
      {"carried over the gap", components(2007, 3, 10, 27), 1173607200},
  };
  for (auto row : rows) {
    row.fields.timeZone.reset();
    EXPECT_EQ(GregorianCalendar().dateFromComponents(row.fields), instant(row.expected))
        << row.name;
  }
}

TEST(GregorianCalendarTest, CurrentYearIsThatOfItsZone) {
  const auto yearOf = [](std::chrono::system_clock::time_point time) {
    return static_cast<int>(
        std::chrono::year_month_day(std::chrono::floor<std::chrono::days>(time)).year());
  };
  for (const std::int64_t offset : {std::int64_t{0}, std::int64_t{366} * 86400}) {
    const GregorianCalendar calendar(TimeZone::withOffset(offset));
    const auto before = yearOf(std::chrono::system_clock::now() + seconds(offset));
    const std::int64_t year = calendar.currentYear();
    const auto after = yearOf(std::chrono::system_clock::now() + seconds(offset));
    EXPECT_GE(year, before);
    EXPECT_LE(year, after);
  }
}

}  // namespace
