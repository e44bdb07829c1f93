#include "platform/time/DateFormatter.h"

#include <gtest/gtest.h>

#include <chrono>
#include <string>

#include "platform/time/GregorianCalendar.h"
#include "tests/support/EnvironmentGuard.h"

namespace {

using platform::DateFormatter;
using platform::PointInTime;

constexpr const char* kPattern = "EEE, dd MMM yyyy HH:mm:ss ZZZZ";
constexpr PointInTime kDate{std::chrono::seconds(1181079000)};  // 2007-06-05T21:30:00Z

/// The locale and the zone of a formatter; null removes the variable.
class Settings {
 public:
  Settings(const char* all, const char* time, const char* lang, const char* zone)
      : all_("LC_ALL", all), time_("LC_TIME", time), lang_("LANG", lang), zone_("TZ", zone) {}

 private:
  EnvironmentGuard all_, time_, lang_, zone_;
};

TEST(DateFormatterTest, WritesTheOffsetOfTheZone) {
  const struct {
    const char* zone;
    const char* text;
  } rows[] = {
      {"UTC", "Tue, 05 Jun 2007 21:30:00 GMT"},
      {"America/Los_Angeles", "Tue, 05 Jun 2007 14:30:00 GMT-07:00"},
      {"Europe/Berlin", "Tue, 05 Jun 2007 23:30:00 GMT+02:00"},
      {"Asia/Kolkata", "Wed, 06 Jun 2007 03:00:00 GMT+05:30"},
      {"EST5", "Tue, 05 Jun 2007 16:30:00 GMT-05:00"},
      {"CET-1CEST,M3.5.0,M10.5.0/3", "Tue, 05 Jun 2007 23:30:00 GMT+02:00"},
      {"Nowhere/City", "Tue, 05 Jun 2007 21:30:00 GMT"},
      {"", "Tue, 05 Jun 2007 21:30:00 GMT"},
  };
  for (const auto& row : rows) {
    const Settings settings("C", nullptr, nullptr, row.zone);
    EXPECT_EQ(DateFormatter(kPattern).format(kDate), row.text) << row.zone;
  }
}

TEST(DateFormatterTest, OffsetIsThatOfTheDate) {
  const PointInTime winter = kDate + std::chrono::days(183);
  for (const char* zone : {"Europe/Berlin", "CET-1CEST,M3.5.0,M10.5.0/3"}) {
    const Settings settings("C", nullptr, nullptr, zone);
    const DateFormatter formatter(kPattern);
    EXPECT_EQ(formatter.format(kDate), "Tue, 05 Jun 2007 23:30:00 GMT+02:00") << zone;
    EXPECT_EQ(formatter.format(winter), "Wed, 05 Dec 2007 22:30:00 GMT+01:00") << zone;
    EXPECT_EQ(DateFormatter("Z zzzz VVVV").format(winter), "+0100 GMT+01:00 GMT+01:00") << zone;
  }
}

TEST(DateFormatterTest, LocaleOfAnotherCalendarCountsByIt) {
  const Settings settings("fa_IR", nullptr, nullptr, "UTC");
  EXPECT_EQ(DateFormatter("dd MMMM yyyy HH:mm:ss").format(kDate), "۱۵ خرداد ۱۳۸۶ ۲۱:۳۰:۰۰");
}

TEST(DateFormatterTest, FirstVariableThatIsNotEmptyNamesTheLocale) {
  const std::string english = "Tue, 05 Jun 2007 21:30:00 GMT";
  const std::string german = "Di., 05 Juni 2007 21:30:00 GMT";
  const std::string french = "mar., 05 juin 2007 21:30:00 UTC";
  const struct {
    const char* all;
    const char* time;
    const char* lang;
    const std::string& text;
  } rows[] = {
      {nullptr, nullptr, nullptr, english},
      {"", "", "", english},
      {"de_DE", "fr_FR", "fr_FR", german},
      {nullptr, "de_DE.UTF-8", "fr_FR", german},
      {"", "de_DE.ISO-8859-1@euro", "fr_FR", german},
      {nullptr, nullptr, "de_DE", german},
      {"", "", "de", german},
      {"C", "de_DE", "de_DE", english},
      {"POSIX", "de_DE", "de_DE", english},
      {"C.UTF-8", "de_DE", "de_DE", english},
      {"nonsense", "de_DE", "de_DE", english},
      {"xx_YY.UTF-8", "de_DE", "de_DE", english},
      {"/usr/share/locale/de", "de_DE", "de_DE", english},
      {".UTF-8", "de_DE", "de_DE", english},
      {"@euro", "de_DE", "de_DE", english},
      {"\xFF\xFE", "de_DE", "de_DE", english},
      {"de_NOWHERE", nullptr, nullptr, german},
      {"fr_FR.UTF-8", nullptr, nullptr, french},
  };
  for (const auto& row : rows) {
    const Settings settings(row.all, row.time, row.lang, "UTC");
    EXPECT_EQ(DateFormatter(kPattern).format(kDate), row.text)
        << (row.all ? row.all : "-") << " " << (row.time ? row.time : "-") << " "
        << (row.lang ? row.lang : "-");
  }
}

TEST(DateFormatterTest, ModifierMayNameTheScript) {
  const struct {
    const char* locale;
    const char* month;
  } rows[] = {{"sr_RS", "јун"},    {"sr_RS@latin", "jun"}, {"sr_RS.UTF-8@latin", "jun"},
              {"sr@latin", "jun"}, {"uz_UZ", "Iyn"},       {"uz_UZ.UTF-8@cyrillic", "июн"}};
  for (const auto& row : rows) {
    const Settings settings(row.locale, nullptr, nullptr, "UTC");
    EXPECT_EQ(DateFormatter("LLL").format(kDate), row.month) << row.locale;
  }
}

TEST(DateFormatterTest, KeepsTheSettingsThatItWasMadeWith) {
  std::string text;
  {
    const Settings settings("de_DE", nullptr, nullptr, "Europe/Berlin");
    const DateFormatter formatter(kPattern);
    const Settings others("C", nullptr, nullptr, "UTC");
    text = formatter.format(kDate);
  }
  EXPECT_EQ(text, "Di., 05 Juni 2007 23:30:00 GMT+02:00");
}

TEST(DateFormatterTest, WritesTheDatesOfTheCalendar) {
  const Settings settings("C", nullptr, nullptr, "UTC");
  const DateFormatter formatter("yyyy-MM-dd");
  const struct {
    std::int64_t year, month, day;
    const char* text;
  } rows[] = {
      {2007, 6, 5, "2007-06-05"},
      {1582, 10, 10, "1582-10-10"},
      {107, 6, 5, "0107-06-05"},
      {1, 1, 1, "0001-01-01"},
      {9999, 12, 31, "9999-12-31"},
      {30000, 1, 1, "30000-01-01"},
      {5828000, 7, 8, "5828000-07-08"},
      // The pattern writes the year of the era: 0 is 1 B.C.
      {0, 2, 29, "0001-02-29"},
      {-400, 2, 29, "0401-02-29"},
  };
  for (const auto& row : rows) {
    platform::DateComponents fields;
    fields.year = row.year;
    fields.month = row.month;
    fields.day = row.day;
    const auto date = platform::GregorianCalendar().dateFromComponents(fields);
    ASSERT_TRUE(date) << row.text;
    EXPECT_EQ(formatter.format(*date), row.text);
  }
}

TEST(DateFormatterTest, WritesSomethingForTheFarthestTimes) {
  const Settings settings("C", nullptr, nullptr, "America/Los_Angeles");
  const DateFormatter formatter("yyyy");
  // The last year that ICU counts, and the first, which it counts in B.C.
  EXPECT_EQ(formatter.format(PointInTime::max()), "5828963");
  EXPECT_EQ(formatter.format(PointInTime::min()).size(), std::string("5838390").size());
}

TEST(DateFormatterTest, RoundsMillisecondsDown) {
  const Settings settings("C", nullptr, nullptr, "UTC");
  const DateFormatter formatter("HH:mm:ss");
  EXPECT_EQ(formatter.format(kDate + std::chrono::milliseconds(999)), "21:30:00");
  EXPECT_EQ(formatter.format(PointInTime(std::chrono::milliseconds(-1))), "23:59:59");
}

TEST(DateFormatterTest, PatternsWithoutSymbols) {
  const Settings settings("C", nullptr, nullptr, "UTC");
  EXPECT_EQ(DateFormatter("").format(kDate), "");
  EXPECT_EQ(DateFormatter("'year' yyyy").format(kDate), "year 2007");
}

TEST(DateFormatterTest, AnotherLocaleAndZoneAreThoseOfTheCaller) {
  const Settings settings("de_DE.UTF-8", nullptr, nullptr, "Asia/Tokyo");
  EXPECT_EQ(DateFormatter(kPattern, "C", platform::TimeZone::withOffset(0)).format(kDate),
            "Tue, 05 Jun 2007 21:30:00 GMT");
  EXPECT_EQ(DateFormatter("EEE HH:mm", "fr_FR", platform::TimeZone::withOffset(3600)).format(kDate),
            "mar. 22:30");
}

}  // namespace
