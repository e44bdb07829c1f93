#include "companions/transfers/QELRetrySchedule.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <vector>

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;
using Wait = std::optional<milliseconds>;

platform::ErrorRecord status(std::int64_t code) {
  return {"HTTP", code, "HTTP status " + std::to_string(code)};
}

/// Wed, 21 Oct 2015 07:28:00 GMT.
constexpr platform::PointInTime kNow{seconds(1445412480)};

TEST(QELRetryScheduleTest, ThreeMoreTriesAreMade) {
  QELRetrySchedule schedule;
  EXPECT_EQ(schedule.waitAfter(status(503), "", kNow), Wait(seconds(1)));
  EXPECT_EQ(schedule.waitAfter(status(503), "", kNow), Wait(seconds(4)));
  EXPECT_EQ(schedule.waitAfter(status(503), "", kNow), Wait(seconds(16)));
  EXPECT_EQ(schedule.waitAfter(status(503), "", kNow), std::nullopt);
  EXPECT_EQ(schedule.waitAfter(status(503), "5", kNow), std::nullopt);
}

TEST(QELRetryScheduleTest, OnlyPassingFailuresAreTriedAgain) {
  for (const std::int64_t code : {408, 425, 429, 500, 502, 503, 504}) {
    EXPECT_EQ(QELRetrySchedule().waitAfter(status(code), "", kNow), Wait(seconds(1))) << code;
  }
  for (const std::int64_t code : {200, 206, 301, 400, 401, 403, 404, 410, 416, 501, 505}) {
    EXPECT_EQ(QELRetrySchedule().waitAfter(status(code), "9", kNow), std::nullopt) << code;
  }
  constexpr std::int64_t kRefused = 7;
  constexpr std::int64_t kBadCertificate = 60;
  EXPECT_EQ(QELRetrySchedule().waitAfter({"transfer", kRefused, ""}, "", kNow), Wait(seconds(1)));
  EXPECT_EQ(QELRetrySchedule().waitAfter({"transfer", kBadCertificate, ""}, "", kNow),
            std::nullopt);
  EXPECT_EQ(QELRetrySchedule().waitAfter({"POSIX", kRefused, ""}, "", kNow), std::nullopt);
}

struct Row {
  const char* field;
  milliseconds wait;
};

TEST(QELRetryScheduleTest, TheServerMayAskForAnotherWait) {
  const std::vector<Row> rows = {
      {"0", seconds(0)},
      {"7", seconds(7)},
      {" 7 ", seconds(7)},
      {"60", seconds(60)},
      {"61", seconds(60)},
      {"99999999999999999999", seconds(60)},
      {"-7", seconds(1)},
      {"7.5", seconds(1)},
      {"soon", seconds(1)},
      {"Wed, 21 Oct 2015 07:28:09 GMT", seconds(9)},
      {"Wed, 21 Oct 2015 07:27:00 GMT", seconds(0)},
      {"Fri, 21 Oct 2016 07:28:00 GMT", seconds(60)},
  };
  for (const Row& row : rows) {
    EXPECT_EQ(QELRetrySchedule().waitAfter(status(429), row.field, kNow), row.wait) << row.field;
  }
}

}  // namespace
