#include "dates/RFC822Parsing.h"

#include <gtest/gtest.h>

#include <chrono>
#include <string>
#include <thread>
#include <vector>

#include "platform/time/GregorianCalendar.h"
#include "tests/support/EnvironmentGuard.h"

namespace {

using platform::PointInTime;
using std::chrono::day;
using std::chrono::days;
using std::chrono::hours;
using std::chrono::minutes;
using std::chrono::month;
using std::chrono::seconds;
using std::chrono::sys_days;
using std::chrono::year;

PointInTime at(int y, unsigned m, unsigned d, int hour = 0, int minute = 0, int second = 0) {
  return sys_days(year(y) / month(m) / day(d)) + hours(hour) + minutes(minute) + seconds(second);
}

class RFC822ParsingTest : public testing::Test {
 private:
  EnvironmentGuard zone_{"TZ", "UTC"};
};

TEST_F(RFC822ParsingTest, Accepts) {
  const struct {
    std::string_view text;
    PointInTime date;
  } rows[] = {
      // with and without a day name, which nobody checks
      {"Tue, 05 Jun 2007 14:30:00 PDT", at(2007, 6, 5, 21, 30)},
      {"05 Jun 2007 14:30:00 PDT", at(2007, 6, 5, 21, 30)},
      {"Sun, 05 Jun 2007 14:30:00 GMT", at(2007, 6, 5, 14, 30)},
      {"? 05 Jun 2007 14:30:00 GMT", at(2007, 6, 5, 14, 30)},
      {" 05 Jun 2007 14:30:00 GMT", at(2007, 6, 5, 14, 30)},
      // separators: all horizontal white space, no line breaks
      {"05\tJun\u00A02007\u300014:30:00\u2003GMT", at(2007, 6, 5, 14, 30)},
      {"\n05 Jun 2007 14:30:00 GMT", at(2007, 6, 5, 14, 30)},
      {"Tue,\n05 Jun 2007 14:30:00 GMT", at(2007, 6, 1, 14, 30) - days(1)},
      // day
      {"5 Jun 2007 10:00 GMT", at(2007, 6, 5, 10)},
      {"05, Jun 2007 10:00 GMT", at(2007, 6, 5, 10)},
      {"+5th Jun 2007 10:00 GMT", at(2007, 6, 5, 10)},
      {"32 May 2007 10:00 GMT", at(2007, 6, 1, 10)},
      {"0 Jun 2007 10:00 GMT", at(2007, 5, 31, 10)},
      {"-1 Jun 2007 10:00 GMT", at(2007, 5, 30, 10)},
      {"x Jun 2007 10:00 GMT", at(2007, 5, 31, 10)},
      {"366 Jan 2007 10:00 GMT", at(2008, 1, 1, 10)},
      // month
      {"05 JAN 2007 10:00 GMT", at(2007, 1, 5, 10)},
      {"05 february 2007 10:00 GMT", at(2007, 2, 5, 10)},
      {"05 mar 2007 10:00 GMT", at(2007, 3, 5, 10)},
      {"05 April 2007 10:00 GMT", at(2007, 4, 5, 10)},
      {"05 MAY 2007 10:00 GMT", at(2007, 5, 5, 10)},
      {"05 June 2007 10:00 GMT", at(2007, 6, 5, 10)},
      {"05 jul 2007 10:00 GMT", at(2007, 7, 5, 10)},
      {"05 August 2007 10:00 GMT", at(2007, 8, 5, 10)},
      {"05 Sept. 2007 10:00 GMT", at(2007, 9, 5, 10)},
      {"05 oct 2007 10:00 GMT", at(2007, 10, 5, 10)},
      {"05 novx 2007 10:00 GMT", at(2007, 11, 5, 10)},
      {"05 Dec 2007 10:00 GMT", at(2007, 12, 5, 10)},
      {"05 Foo 2007 10:00 GMT", at(2007, 1, 5, 10)},
      {"05 Ju 2007 10:00 GMT", at(2007, 1, 5, 10)},
      {"05 xJun 2007 10:00 GMT", at(2007, 1, 5, 10)},
      {"05 6 2007 10:00 GMT", at(2007, 1, 5, 10)},
      {"05 Mär 2007 10:00 GMT", at(2007, 1, 5, 10)},
      {"05 \xFF 2007 10:00 GMT", at(2007, 1, 5, 10)},
      // year
      {"05 Jun 2007AD 10:00 GMT", at(2007, 6, 5, 10)},
      {"05 Jun 100 10:00 GMT", at(100, 6, 5, 10)},
      {"05 Jun 107 10:00 GMT", at(107, 6, 5, 10)},
      {"05 Jun 0107 10:00 GMT", at(107, 6, 5, 10)},
      {"15 Oct 1582 10:00 GMT", at(1582, 10, 15, 10)},
      {"05 Jun 9999 10:00 GMT", at(9999, 6, 5, 10)},
      {"05 Jun 30000 10:00 GMT", at(30000, 6, 5, 10)},
      {"05 Jun -5 10:00 GMT", at(1995, 6, 5, 10)},
      {"05 Jun -2000 10:00 GMT", at(0, 6, 5, 10)},
      {"05 Jun -2407 10:00 GMT", at(-407, 6, 5, 10)},
      {"05 Jun x 10:00 GMT", at(2000, 6, 5, 10)},
      // time
      {"05 Jun 2007 14:30 GMT", at(2007, 6, 5, 14, 30)},
      {"05 Jun 2007 14:30:15 GMT", at(2007, 6, 5, 14, 30, 15)},
      {"05 Jun 2007 14:30:15:99 GMT", at(2007, 6, 5, 14, 30)},
      {"05 Jun 2007 14:30:15.99 GMT", at(2007, 6, 5, 14, 30, 15)},
      {"05 Jun 2007 14: GMT", at(2007, 6, 5, 14)},
      {"05 Jun 2007 : GMT", at(2007, 6, 5)},
      {"05 Jun 2007 :: GMT", at(2007, 6, 5)},
      {"05 Jun 2007 x:y:z GMT", at(2007, 6, 5)},
      {"05 Jun 2007 24:00 GMT", at(2007, 6, 6)},
      {"05 Jun 2007 25:61:61 GMT", at(2007, 6, 6, 2, 2, 1)},
      {"05 Jun 2007 -1:30 GMT", at(2007, 6, 4, 23, 30)},
      {"31 Dec 2005 23:59:60 GMT", at(2006, 1, 1)},
      // signed zones
      {"05 Jun 07 14:30 +0200", at(2007, 6, 5, 12, 30)},
      {"05 Jun 07 14:30 +02:00", at(2007, 6, 5, 12, 30)},
      {"05 Jun 07 14:30 -0530", at(2007, 6, 5, 20)},
      {"05 Jun 07 14:30 -05:30", at(2007, 6, 5, 20)},
      {"05 Jun 07 14:30 +05", at(2007, 6, 5, 9, 30)},
      {"05 Jun 07 14:30 +053", at(2007, 6, 5, 9, 27)},
      {"05 Jun 07 14:30 +0199", at(2007, 6, 5, 11, 51)},
      {"05 Jun 07 14:30 +9999", at(2007, 6, 5, 14, 30) - minutes(99 * 60 + 99)},
      {"05 Jun 07 14:30 +0000", at(2007, 6, 5, 14, 30)},
      {"05 Jun 07 14:30 -0000", at(2007, 6, 5, 14, 30)},
      {"05 Jun 07 14:30 +5:30", at(2007, 6, 5, 9)},
      {"05 Jun 07 14:30 +005:30", at(2007, 6, 5, 14, 25)},
      {"05 Jun 07 14:30 +01000", at(2007, 6, 5, 14, 30) - hours(1)},
      {"05 Jun 07 14:30 +0:1:0", at(2007, 6, 5, 13, 30)},
      {"05 Jun 07 14:30 +xx30", at(2007, 6, 5, 14)},
      {"05 Jun 07 14:30 +-130", at(2007, 6, 5, 15)},
      {"05 Jun 07 14:30 +äö30", at(2007, 6, 5, 14)},
      {"05 Jun 07 14:30 +\xFF\xFE", at(2007, 6, 5, 14, 30)},
      // named zones: the region decides about daylight saving time, not the abbreviation
      {"05 Jun 2007 14:30 UT", at(2007, 6, 5, 14, 30)},
      {"05 Jun 2007 14:30 gmt", at(2007, 6, 5, 14, 30)},
      {"05 Jun 2007 14:30 EST", at(2007, 6, 5, 18, 30)},
      {"05 Jun 2007 14:30 EDT", at(2007, 6, 5, 18, 30)},
      {"05 Jun 2007 14:30 CST", at(2007, 6, 5, 19, 30)},
      {"05 Jun 2007 14:30 CDT", at(2007, 6, 5, 19, 30)},
      {"05 Jun 2007 14:30 MST", at(2007, 6, 5, 20, 30)},
      {"05 Jun 2007 14:30 MDT", at(2007, 6, 5, 20, 30)},
      {"05 Jun 2007 14:30 PST", at(2007, 6, 5, 21, 30)},
      {"05 Jun 2007 14:30 pdt", at(2007, 6, 5, 21, 30)},
      {"Wed, 05 Dec 2007 14:30:00 EDT", at(2007, 12, 5, 19, 30)},
      {"Wed, 05 Dec 2007 14:30:00 PDT", at(2007, 12, 5, 22, 30)},
      {"Sun, 11 Mar 2007 02:30:00 PST", at(2007, 3, 11, 10, 30)},
      {"Sun, 04 Nov 2007 01:30:00 PDT", at(2007, 11, 4, 9, 30)},
      {"Tue, 05 Jun 30000 14:30:00 PDT", at(30000, 6, 5, 21, 30)},
      // military zones
      {"05 Jun 2007 14:30 Z", at(2007, 6, 5, 14, 30)},
      {"05 Jun 2007 14:30 z", at(2007, 6, 5, 14, 30)},
      {"05 Jun 2007 14:30 A", at(2007, 6, 5, 15, 30)},
      {"05 Jun 2007 14:30 n", at(2007, 6, 5, 13, 30)},
      {"05 Jun 2007 14:30 J", at(2007, 6, 5, 14, 30)},
      {"05 Jun 2007 14:30 1", at(2007, 6, 5, 14, 30)},
      {"05 Jun 2007 14:30 +", at(2007, 6, 5, 14, 30)},
      {"05 Jun 2007 14:30 é", at(2007, 6, 5, 14, 30)},
      // unknown zones are the local one, UTC here
      {"05 Jun 2007 14:30 UTC", at(2007, 6, 5, 14, 30)},
      {"05 Jun 2007 14:30 BST", at(2007, 6, 5, 14, 30)},
      {"05 Jun 2007 14:30 ", at(2007, 6, 5, 14, 30)},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(dateWithRFC822String(row.text), row.date) << "\"" << row.text << "\"";
  }
}

TEST_F(RFC822ParsingTest, Rejects) {
  EXPECT_EQ(dateWithRFC822String(std::nullopt), std::nullopt);
  const std::string_view rows[] = {
      // field counts
      "",
      " ",
      "2007",
      "2007-06-05T14:30:00Z",
      "05 Jun 2007 14:30:00",
      "05 Jun 2007 14:30:00\nGMT",
      "Tue,  05 Jun 2007 14:30:00 GMT",
      "Tue, 05 Jun 2007 14:30:00 GMT ",
      " Tue, 05 Jun 2007 14:30:00 GMT",
      "Tue, 05 Jun 2007 14:30:00 GMT (local)",
      "    ",
      // times without ":"
      "05 Jun 2007 1430 GMT",
      "05 Jun 2007  GMT",
      "     ",
      "05 Jun 2007 14.30 +0200",
      // signed zones of one character
      "05 Jun 2007 14:30 +5",
      "05 Jun 2007 14:30 -5",
      "05 Jun 2007 14:30 +ä",
      // dates that no calendar counts
      "05 Jun 99999999999 14:30 GMT",
      "05 Jun -99999999999 14:30 GMT",
      "05 Jun 9223372036854775807 14:30 GMT",
      "-9223372036854775808 Jun 2007 14:30 GMT",
      "99999999999999999999999 Jun 2007 14:30 GMT",
      "05 Jun 2007 9223372036854775807:30 GMT",
      "05 Jun 2007 14:-9223372036854775808 PDT",
      "05 Jun 2007 14:30:9223372036854775807 UTC",
      "05 Jun 2007 14:30 +019223372036854775807",
      "05 Jun 2007 14:30 -01-9223372036854775808",
  };
  for (const auto& row : rows) {
    EXPECT_EQ(dateWithRFC822String(row), std::nullopt) << "\"" << row << "\"";
  }
}

TEST_F(RFC822ParsingTest, TwoDigitYearsAreTheHundredUpToTheCurrentOne) {
  const auto current = static_cast<int>(platform::GregorianCalendar().currentYear());
  for (int twoDigits = 0; twoDigits < 100; ++twoDigits) {
    const int expected = 2000 + twoDigits > current ? 1900 + twoDigits : 2000 + twoDigits;
    const std::string text = "05 Jun " + std::to_string(twoDigits) + " 10:00 GMT";
    EXPECT_EQ(dateWithRFC822String(text), at(expected, 6, 5, 10)) << text;
  }
  EXPECT_EQ(dateWithRFC822String("05 Jun 00 10:00 GMT"), at(2000, 6, 5, 10));
  EXPECT_EQ(dateWithRFC822String("05 Jun 007 10:00 GMT"), at(2007, 6, 5, 10));
}

TEST_F(RFC822ParsingTest, UnknownZonesAreTheLocalOne) {
  const EnvironmentGuard zone("TZ", "America/Los_Angeles");
  for (const std::string name : {"UTC", "BST", "", "PDTX", "AA", "ß"}) {
    EXPECT_EQ(dateWithRFC822String("05 Jun 2007 14:30 " + name), at(2007, 6, 5, 21, 30)) << name;
    EXPECT_EQ(dateWithRFC822String("05 Dec 2007 14:30 " + name), at(2007, 12, 5, 22, 30)) << name;
  }
}

TEST_F(RFC822ParsingTest, NoDateLeavesItsZoneToTheNext) {
  const EnvironmentGuard zone("TZ", "Europe/Berlin");
  for (int round = 0; round < 2; ++round) {
    for (const std::string before : {"PDT", "A", "+0900", "Z", "GMT"}) {
      ASSERT_TRUE(dateWithRFC822String("05 Jun 2007 14:30 " + before)) << before;
      EXPECT_EQ(dateWithRFC822String("05 Jun 2007 14:30 BST"), at(2007, 6, 5, 12, 30)) << before;
    }
  }
}

TEST_F(RFC822ParsingTest, InstallsItsTableOfAbbreviations) {
  platform::TimeZone::setAbbreviationTable({{"BST", "Europe/London"}});
  ASSERT_TRUE(dateWithRFC822String("05 Jun 2007 14:30 +0100"));
  EXPECT_TRUE(platform::TimeZone::withAbbreviation("BST"));
  ASSERT_TRUE(dateWithRFC822String("05 Jun 2007 14:30 XYZ"));
  EXPECT_FALSE(platform::TimeZone::withAbbreviation("BST"));
  EXPECT_TRUE(platform::TimeZone::withAbbreviation("PDT"));
}

TEST_F(RFC822ParsingTest, MillionsOfFieldsAreNoDate) {
  EXPECT_EQ(dateWithRFC822String(std::string(50'000'000, ' ')), std::nullopt);
  EXPECT_EQ(dateWithRFC822String("05 Jun 2007 " + std::string(50'000'000, ':') + " GMT"),
            at(2007, 6, 5));
}

TEST_F(RFC822ParsingTest, ThreadsParseAtTheSameTime) {
  std::vector<std::thread> threads;
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([] {
      for (int round = 0; round < 200; ++round) {
        EXPECT_EQ(dateWithRFC822String("05 Jun 2007 14:30 PDT"), at(2007, 6, 5, 21, 30));
        EXPECT_EQ(dateWithRFC822String("05 Jun 2007 14:30 EST"), at(2007, 6, 5, 18, 30));
        EXPECT_EQ(dateWithRFC822String("05 Jun 2007 14:30 BST"), at(2007, 6, 5, 14, 30));
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
}

TEST_F(RFC822ParsingTest, MilitaryZones) {
  const struct {
    char letter;
    std::int64_t offset;
  } rows[] = {
      {'A', -3600},  {'B', -7200},  {'C', -10800}, {'D', -14400}, {'E', -18000}, {'F', -21600},
      {'G', -25200}, {'H', -28800}, {'I', -32400}, {'J', 0},      {'K', -36000}, {'L', -39600},
      {'M', -43200}, {'N', 3600},   {'O', 7200},   {'P', 10800},  {'Q', 14400},  {'R', 18000},
      {'S', 21600},  {'T', 25200},  {'U', 28800},  {'V', 32400},  {'W', 36000},  {'X', 39600},
      {'Y', 43200},  {'Z', 0},      {'1', 0},      {'+', 0},      {'@', 0},      {'[', 0},
      {' ', 0},      {'\0', 0},
  };
  for (const auto& row : rows) {
    const std::string upper(1, row.letter);
    const std::string lower(1, static_cast<char>(std::tolower(row.letter)));
    for (const std::string& text : {upper, lower}) {
      const auto zone = timeZoneWithMilitaryAbbreviation(text);
      ASSERT_TRUE(zone) << text;
      EXPECT_EQ(zone->offsetAt(at(2007, 6, 5)), row.offset) << text;
      EXPECT_EQ(zone->offsetAt(at(2007, 12, 5)), row.offset) << text;
    }
  }
}

TEST_F(RFC822ParsingTest, MilitaryZonesAreOneCharacterLong) {
  EXPECT_FALSE(timeZoneWithMilitaryAbbreviation(std::nullopt));
  for (const std::string_view text : {"", "AA", "UT", "GMT", "Z ", "éa"}) {
    EXPECT_FALSE(timeZoneWithMilitaryAbbreviation(text)) << text;
  }
  for (const std::string_view text : {"é", "ß", "€", "\xFF"}) {
    const auto zone = timeZoneWithMilitaryAbbreviation(text);
    ASSERT_TRUE(zone) << text;
    EXPECT_EQ(zone->offsetAt(at(2007, 6, 5)), 0) << text;
  }
}

}  // namespace
