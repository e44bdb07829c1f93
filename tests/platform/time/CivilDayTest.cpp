#include "platform/time/CivilDay.h"

#include <gtest/gtest.h>

namespace platform {
namespace {

TEST(CivilDayTest, DaysAndDatesGiveEachOther) {
  const struct {
    CivilDay civil;
    std::int64_t days;
  } rows[] = {
      {{1970, 1, 1}, 0},         {{1969, 12, 31}, -1},
      {{2000, 2, 29}, 11016},    {{2000, 3, 1}, 11017},
      {{1900, 3, 1}, -25508},    {{1, 1, 1}, -719162},
      {{0, 2, 29}, -719469},     {{0, 1, 1}, -719528},
      {{-1, 12, 31}, -719529},   {{-400, 1, 1}, -719528 - 146097},
      {{32768, 1, 1}, 11248738}, {{400'000'000'001, 1, 1}, 146'097'000'000'000 - 719162},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(daysFromCivil(row.civil), row.days) << row.civil.year;
    const CivilDay civil = civilFromDays(row.days);
    EXPECT_EQ(civil.year, row.civil.year);
    EXPECT_EQ(civil.month, row.civil.month) << row.civil.year;
    EXPECT_EQ(civil.day, row.civil.day) << row.civil.year;
  }
}

TEST(CivilDayTest, EveryDayOfAnEraHasItsOwnDate) {
  for (std::int64_t days = -146097; days < 146097; ++days) {
    ASSERT_EQ(daysFromCivil(civilFromDays(days)), days);
  }
}

TEST(CivilDayTest, QuotientsAreRoundedTowardsThePast) {
  EXPECT_EQ(floorQuotient(7, 2), 3);
  EXPECT_EQ(floorQuotient(-7, 2), -4);
  EXPECT_EQ(floorQuotient(-8, 2), -4);
  EXPECT_EQ(floorQuotient(0, 2), 0);
}

}  // namespace
}  // namespace platform
