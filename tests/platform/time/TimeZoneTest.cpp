#include "platform/time/TimeZone.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <limits>
#include <string>
#include <thread>
#include <vector>

#include "tests/support/EnvironmentGuard.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

using platform::PointInTime;
using platform::TimeZone;
using std::chrono::days;
using std::chrono::hours;
using std::chrono::local_days;
using std::chrono::minutes;
using std::chrono::sys_days;
using std::chrono::year;

constexpr std::int64_t kHour = 3600;
constexpr const char* kCentralEurope = "CET-1CEST,M3.5.0,M10.5.0/3";
const PointInTime kSummer = sys_days(year(2007) / 6 / 5) + hours(12);
const PointInTime kWinter = sys_days(year(2007) / 12 / 5) + hours(12);

TEST(TimeZoneTest, FixedOffsetsAreAnyNumberOfSeconds) {
  const std::int64_t offsets[] = {0,
                                  1,
                                  -kHour,
                                  9540,
                                  99 * kHour,
                                  -1'000'000'000'000,
                                  std::numeric_limits<std::int64_t>::max(),
                                  std::numeric_limits<std::int64_t>::min()};
  for (const std::int64_t offset : offsets) {
    EXPECT_EQ(TimeZone::withOffset(offset).offsetAt(kSummer), offset);
    EXPECT_EQ(TimeZone::withOffset(offset).offsetAtLocalTime(local_days(year(2007) / 6 / 5)),
              offset);
  }
}

TEST(TimeZoneTest, OffsetsChangeWithTheSecond) {
  const auto zone = TimeZone::named("America/New_York");
  ASSERT_TRUE(zone);
  const PointInTime spring = sys_days(year(2007) / 3 / 11) + hours(7);
  EXPECT_EQ(zone->offsetAt(spring - std::chrono::seconds(1)), -5 * kHour);
  EXPECT_EQ(zone->offsetAt(spring), -4 * kHour);
  const PointInTime autumn = sys_days(year(2007) / 11 / 4) + hours(6);
  EXPECT_EQ(zone->offsetAt(autumn - std::chrono::seconds(1)), -4 * kHour);
  EXPECT_EQ(zone->offsetAt(autumn), -5 * kHour);
}

TEST(TimeZoneTest, NamedZonesFollowTheirRules) {
  const struct {
    const char* name;
    std::int64_t summer, winter;
  } rows[] = {
      {"UTC", 0, 0},
      {"GMT", 0, 0},
      {"America/New_York", -4 * kHour, -5 * kHour},
      {"America/Chicago", -5 * kHour, -6 * kHour},
      {"America/Denver", -6 * kHour, -7 * kHour},
      {"America/Los_Angeles", -7 * kHour, -8 * kHour},
      {"Europe/Berlin", 2 * kHour, kHour},
      {"Asia/Kolkata", 19800, 19800},
      {"Etc/GMT+5", -5 * kHour, -5 * kHour},
      {"US/Pacific", -7 * kHour, -8 * kHour},
  };
  for (const auto& row : rows) {
    const auto zone = TimeZone::named(row.name);
    ASSERT_TRUE(zone) << row.name;
    EXPECT_EQ(zone->offsetAt(kSummer), row.summer) << row.name;
    EXPECT_EQ(zone->offsetAt(kWinter), row.winter) << row.name;
  }
}

TEST(TimeZoneTest, UnknownNamesAreAbsent) {
  const std::string_view names[] = {
      "",     "Nowhere/City", "Etc/Unknown", "GMT+5",    "GMT+05:30", "UTC+1", "PDT",
      "EST5", "utc",          "America",     "\xFF\xFE", "UTC\n",     " UTC",  "CET-1CEST"};
  for (const std::string_view name : names) EXPECT_FALSE(TimeZone::named(name)) << name;
  EXPECT_FALSE(TimeZone::named(std::string_view("UTC\0", 4)));
  EXPECT_FALSE(TimeZone::named(std::string(100'000, 'A')));
}

TEST(TimeZoneTest, LocalTimesInAGapAndAnOverlap) {
  // In 2007 by the rules as they were listed, in 2600 by those that go on for ever.
  const struct {
    const char* name;
    std::chrono::local_time<std::chrono::milliseconds> time;
    std::int64_t offset;
  } rows[] = {
      {"America/Los_Angeles", local_days(year(2007) / 3 / 11) + minutes(119), -8 * kHour},
      {"America/Los_Angeles", local_days(year(2007) / 3 / 11) + minutes(150), -8 * kHour},
      {"America/Los_Angeles", local_days(year(2007) / 3 / 11) + minutes(180), -7 * kHour},
      {"America/Los_Angeles", local_days(year(2007) / 11 / 4) + minutes(59), -7 * kHour},
      {"America/Los_Angeles", local_days(year(2007) / 11 / 4) + minutes(90), -8 * kHour},
      {"America/Los_Angeles", local_days(year(2007) / 11 / 4) + minutes(120), -8 * kHour},
      {"America/Los_Angeles", local_days(year(2600) / 3 / 9) + minutes(119), -8 * kHour},
      {"America/Los_Angeles", local_days(year(2600) / 3 / 9) + minutes(150), -8 * kHour},
      {"America/Los_Angeles", local_days(year(2600) / 3 / 9) + minutes(180), -7 * kHour},
      {"America/Los_Angeles", local_days(year(2600) / 11 / 2) + minutes(59), -7 * kHour},
      {"America/Los_Angeles", local_days(year(2600) / 11 / 2) + minutes(90), -8 * kHour},
      {"Europe/Berlin", local_days(year(1995) / 3 / 26) + minutes(150), kHour},
      {"Europe/Berlin", local_days(year(1995) / 9 / 24) + minutes(150), kHour},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(TimeZone::named(row.name)->offsetAtLocalTime(row.time), row.offset)
        << row.name << ", ms " << row.time.time_since_epoch().count();
  }
}

TEST(TimeZoneTest, OffsetsOfTheFarthestTimesAreSane) {
  const EnvironmentGuard guard("TZ", kCentralEurope);
  for (const TimeZone& zone : {*TimeZone::named("America/Los_Angeles"), TimeZone::local()}) {
    for (const PointInTime date : {PointInTime::min(), PointInTime::max()}) {
      EXPECT_LE(std::abs(zone.offsetAt(date)), 24 * kHour);
      const TimeZone::LocalTime time(date.time_since_epoch());
      EXPECT_LE(std::abs(zone.offsetAtLocalTime(time)), 24 * kHour);
    }
  }
}

TEST(TimeZoneTest, LocalZoneFollowsTZ) {
  const struct {
    const char* variable;
    std::int64_t summer, winter;
  } rows[] = {
      {"UTC", 0, 0},
      {"America/Los_Angeles", -7 * kHour, -8 * kHour},
      {":Europe/Berlin", 2 * kHour, kHour},
      {"/usr/share/zoneinfo/Asia/Tokyo", 9 * kHour, 9 * kHour},
      {":/usr/share/zoneinfo/Europe/Berlin", 2 * kHour, kHour},
      {"EST5EDT", -4 * kHour, -5 * kHour},
      {"Etc/GMT+5", -5 * kHour, -5 * kHour},
      {"UTC0", 0, 0},
      {"EST5", -5 * kHour, -5 * kHour},
      {"GMT+5", -5 * kHour, -5 * kHour},
      {"<+0330>-3:30", 12600, 12600},
      {kCentralEurope, 2 * kHour, kHour},
      {"CET-1CEST", 2 * kHour, kHour},
      {"EST5EDT,M3.2.0,M11.1.0", -4 * kHour, -5 * kHour},
      {"<+0330>-3:30<+0430>,J79/24,J263/24", 16200, 12600},
      {"NZST-12NZDT,M9.5.0,M4.1.0/3", 12 * kHour, 13 * kHour},
      {"IST-1GMT0,M10.5.0,M3.5.0/1", kHour, 0},
      {"<-03>3<-02>,M3.5.0/-2,M10.5.0/-1", -2 * kHour, -3 * kHour},
      {"XXX-24:59:59", 89999, 89999},
      {"", 0, 0},
      {":", 0, 0},
      {"Nowhere/City", 0, 0},
      {"\xFF\xFE", 0, 0},
  };
  for (const auto& row : rows) {
    const EnvironmentGuard guard("TZ", row.variable);
    EXPECT_EQ(TimeZone::local().offsetAt(kSummer), row.summer) << row.variable;
    EXPECT_EQ(TimeZone::local().offsetAt(kWinter), row.winter) << row.variable;
  }
}

TEST(TimeZoneTest, LocalZoneMayBeAnyZoneFile) {
  const std::filesystem::path database = "/usr/share/zoneinfo";
  if (!exists(database / "Europe/Berlin")) GTEST_SKIP() << "no database is installed";
  const TemporaryDirectory directory;
  const std::string copy = directory / "zone";
  copy_file(database / "Europe/Berlin", copy);
  const struct {
    std::string variable;
    std::int64_t summer, winter;
    const char* file;
  } rows[] = {
      {copy, 2 * kHour, kHour, ""},
      {":" + copy, 2 * kHour, kHour, ""},
      {"posix/Europe/Berlin", 2 * kHour, kHour, "posix/Europe/Berlin"},
      {":posix/Europe/Berlin", 2 * kHour, kHour, "posix/Europe/Berlin"},
      {database / "posix/Europe/Berlin", 2 * kHour, kHour, "posix/Europe/Berlin"},
      {"right/Europe/Berlin", 2 * kHour, kHour, "right/Europe/Berlin"},
      {"posixrules", -4 * kHour, -5 * kHour, "posixrules"},
  };
  for (const auto& row : rows) {
    if (!exists(database / row.file)) continue;
    const EnvironmentGuard guard("TZ", row.variable.c_str());
    EXPECT_EQ(TimeZone::local().offsetAt(kSummer), row.summer) << row.variable;
    EXPECT_EQ(TimeZone::local().offsetAt(kWinter), row.winter) << row.variable;
  }
}

TEST(TimeZoneTest, LocalZoneWithoutTZIsThatOfTheMachine) {
  for (const char* variable : {static_cast<const char*>(nullptr), ":/etc/localtime"}) {
    const EnvironmentGuard guard("TZ", variable);
    for (const PointInTime date : {kSummer, kWinter}) {
      const time_t time = std::chrono::system_clock::to_time_t(date);
      struct tm fields {};
      tzset();
      ASSERT_NE(localtime_r(&time, &fields), nullptr);
      EXPECT_EQ(TimeZone::local().offsetAt(date), fields.tm_gmtoff);
    }
  }
}

TEST(TimeZoneTest, RulesOfTZAreThoseOfTheDatabase) {
  // The rules that the database has for the year 2010, every quarter of an hour of it.
  const struct {
    const char* variable;
    const char* name;
  } rows[] = {
      {"PST8PDT,M3.2.0,M11.1.0", "America/Los_Angeles"},
      {kCentralEurope, "Europe/Berlin"},
      {"IST-1GMT0,M10.5.0,M3.5.0/1", "Europe/Dublin"},
      {"NZST-12NZDT,M9.5.0,M4.1.0/3", "Pacific/Auckland"},
      {"<+1030>-10:30<+11>-11,M10.1.0,M4.1.0", "Australia/Lord_Howe"},
      {"<-03>3<-02>,M3.5.0/-2,M10.5.0/-1", "America/Godthab"},
      {"<+14>-14", "Pacific/Kiritimati"},
  };
  for (const auto& row : rows) {
    const EnvironmentGuard guard("TZ", row.variable);
    const TimeZone local = TimeZone::local();
    const TimeZone named = *TimeZone::named(row.name);
    for (PointInTime date = sys_days(year(2010) / 1 / 1); date < sys_days(year(2011) / 1 / 1);
         date += minutes(15)) {
      for (const PointInTime::duration early :
           {PointInTime::duration(0), PointInTime::duration(1)}) {
        const PointInTime instant = date - early;
        const TimeZone::LocalTime time(instant.time_since_epoch());
        ASSERT_EQ(local.offsetAt(instant), named.offsetAt(instant))
            << row.variable << ", ms " << instant.time_since_epoch().count();
        ASSERT_EQ(local.offsetAtLocalTime(time), named.offsetAtLocalTime(time))
            << row.variable << ", local ms " << time.time_since_epoch().count();
      }
    }
  }
}

TEST(TimeZoneTest, AbbreviationsComeFromTheTable) {
  TimeZone::setAbbreviationTable({});
  EXPECT_FALSE(TimeZone::withAbbreviation("PDT"));
  TimeZone::setAbbreviationTable({{"PDT", "America/Los_Angeles"}, {"BAD", "Nowhere/City"}});
  ASSERT_TRUE(TimeZone::withAbbreviation("PDT"));
  EXPECT_EQ(TimeZone::withAbbreviation("PDT")->offsetAt(kWinter), -8 * kHour);
  EXPECT_FALSE(TimeZone::withAbbreviation("pdt"));
  EXPECT_FALSE(TimeZone::withAbbreviation("BAD"));
  EXPECT_FALSE(TimeZone::withAbbreviation("EST"));
  EXPECT_FALSE(TimeZone::withAbbreviation(""));
  // A new table replaces the whole of the old one.
  TimeZone::setAbbreviationTable({{"EST", "America/New_York"}});
  EXPECT_FALSE(TimeZone::withAbbreviation("PDT"));
  EXPECT_EQ(TimeZone::withAbbreviation("EST")->offsetAt(kSummer), -4 * kHour);
}

TEST(TimeZoneTest, ThreadsShareZones) {
  const EnvironmentGuard guard("TZ", kCentralEurope);
  std::vector<std::thread> threads;
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([] {
      for (int round = 0; round < 200; ++round) {
        TimeZone::setAbbreviationTable({{"PST", "America/Los_Angeles"}});
        EXPECT_EQ(TimeZone::withAbbreviation("PST")->offsetAt(kSummer), -7 * kHour);
        EXPECT_EQ(TimeZone::named("Asia/Kolkata")->offsetAt(kSummer), 19800);
        EXPECT_EQ(TimeZone::local().offsetAt(kSummer), 2 * kHour);
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
}

}  // namespace
