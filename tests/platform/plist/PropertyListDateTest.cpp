#include "platform/plist/PropertyListDate.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <string>

namespace platform {
namespace {

using namespace std::chrono_literals;

PointInTime at(std::int64_t seconds) {
  return PointInTime(std::chrono::seconds(seconds));
}

TEST(PropertyListDateTest, DatesOfAllTimesReadBack) {
  const struct {
    PointInTime date;
    const char* text;
    PointInTime readBack;
  } rows[] = {
      {at(0), "1970-01-01T00:00:00Z", at(0)},
      {at(0) + 999ms, "1970-01-01T00:00:00Z", at(0)},
      {at(0) - 1ms, "1969-12-31T23:59:59Z", at(-1)},
      {at(951782400), "2000-02-29T00:00:00Z", at(951782400)},
      {at(978307200), "2001-01-01T00:00:00Z", at(978307200)},
      {at(1078056000), "2004-02-29T12:00:00Z", at(1078056000)},
      {at(1136073599), "2005-12-31T23:59:59Z", at(1136073599)},
      {at(2147483648), "2038-01-19T03:14:08Z", at(2147483648)},
      {at(253402300799), "9999-12-31T23:59:59Z", at(253402300799)},
      {at(253402300800), "10000-01-01T00:00:00Z", at(253402300800)},
      {at(884541340800), "30000-01-01T00:00:00Z", at(884541340800)},
      {at(6311328232780800), "200000000-01-01T00:00:00Z", at(6311328232780800)},
      {at(-62135596800), "0001-01-01T00:00:00Z", at(-62135596800)},
      {at(-62162121600), "0000-02-29T00:00:00Z", at(-62162121600)},
      {at(-62167219200), "0000-01-01T00:00:00Z", at(-62167219200)},
      {at(-62167219201), "-0001-12-31T23:59:59Z", at(-62167219201)},
      {at(-63549360000), "-0044-03-15T00:00:00Z", at(-63549360000)},
      {PointInTime::max(), "292278994-08-17T07:12:55Z", at(9223372036854775)},
      // Its second begins before the first point in time.
      {PointInTime::min(), "-292275055-05-16T16:47:04Z", PointInTime::min()},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(propertyListDate(row.date), row.text);
    EXPECT_EQ(dateFromPropertyListText(row.text), row.readBack) << row.text;
  }
}

TEST(PropertyListDateTest, EveryDayOfAnEraReadsBack) {
  // 400 years and some, a prime number of seconds more than a day apart, around the year 0.
  for (std::int64_t i = 0; i < 150000; ++i) {
    const PointInTime date = at(-68500000000 + i * 86413);
    ASSERT_EQ(dateFromPropertyListText(propertyListDate(date)), date) << propertyListDate(date);
  }
}

TEST(PropertyListDateTest, SmallerUnitsMayBeMissing) {
  EXPECT_EQ(dateFromPropertyListText("2005-05-16T12:30Z"), at(1116246600));
  EXPECT_EQ(dateFromPropertyListText("2005-05-16T12Z"), at(1116244800));
  EXPECT_EQ(dateFromPropertyListText("2005-05-16Z"), at(1116201600));
  EXPECT_EQ(dateFromPropertyListText("2005-05Z"), at(1114905600));
  EXPECT_EQ(dateFromPropertyListText("2005Z"), at(1104537600));
}

TEST(PropertyListDateTest, LeapSecondsBelongToTheNextMinute) {
  EXPECT_EQ(dateFromPropertyListText("2016-12-31T23:59:60Z"), at(1483228800));
  EXPECT_EQ(dateFromPropertyListText("2005-05-16T12:30:60Z"), at(1116246660));
  EXPECT_EQ(dateFromPropertyListText("2016-12-31T23:59:60.25Z"), at(1483228800) + 250ms);
}

TEST(PropertyListDateTest, FractionsAreReadToTheMillisecond) {
  EXPECT_EQ(dateFromPropertyListText("1970-01-01T00:00:01.5Z"), at(1) + 500ms);
  EXPECT_EQ(dateFromPropertyListText("1970-01-01T00:00:01,25Z"), at(1) + 250ms);
  EXPECT_EQ(dateFromPropertyListText("1970-01-01T00:00:01.123Z"), at(1) + 123ms);
  EXPECT_EQ(dateFromPropertyListText("1970-01-01T00:00:01.9999999999999999999999Z"), at(1) + 999ms);
  EXPECT_EQ(dateFromPropertyListText("1969-12-31T23:59:59.75Z"), at(0) - 250ms);
  EXPECT_EQ(dateFromPropertyListText("292278994-08-17T07:12:55.9Z"), PointInTime::max());
  EXPECT_EQ(dateFromPropertyListText("-292275055-05-16T16:47:04.9Z"), PointInTime::min());
}

TEST(PropertyListDateTest, RefusesWhatIsNoDate) {
  for (const char* text : {"",
                           "Z",
                           "2005-13-01T00:00:00Z",
                           "2005-00-01T00:00:00Z",
                           "2005-04-31T00:00:00Z",
                           "2005-02-29T00:00:00Z",
                           "1900-02-29T00:00:00Z",
                           "2005-01-00T00:00:00Z",
                           "2005-01-01T24:00:00Z",
                           "2005-01-01T00:60:00Z",
                           "2005-01-01T00:00:61Z",
                           "2005-01-01T00:60:60Z",
                           "2005-01-01T00:00:00",
                           "2005-01-01T00:00:00z",
                           "2005-01-01 00:00:00Z",
                           "2005-01-01T00:00:00.Z",
                           "2005-01-01T00:00:00.5",
                           "2005-01-01T00:00:00.-5Z",
                           "2005-01-01T00:00:00.5.5Z",
                           "2005-01-01T00:00.5Z",
                           "2005-01-01T00.5Z",
                           "2005.5Z",
                           "2005-01-01T00:00:00+00:00",
                           "2005-01-01T00:00:00ZZ",
                           "2005-1-1T0:0:0Z",
                           "2005-01-01T-1:00:00Z",
                           "205-01-01T00:00:00Z",
                           "+2005-01-01T00:00:00Z",
                           "--2005-01-01T00:00:00Z",
                           "2005-01-01T",
                           "2005-01-01TZ",
                           "2005-Z",
                           " 2005Z",
                           "292278995-01-01T00:00:00Z",
                           "-292275056-01-01T00:00:00Z",
                           "999999999-01-01T00:00:00Z",
                           "99999999999999999999-01-01T00:00:00Z"}) {
    EXPECT_EQ(dateFromPropertyListText(text), std::nullopt) << text;
  }
}

}  // namespace
}  // namespace platform
