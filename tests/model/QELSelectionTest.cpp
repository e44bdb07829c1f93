#include "model/QELSelection.h"

#include <gtest/gtest.h>

#include <chrono>
#include <memory>

namespace {

using std::chrono::seconds;

std::unique_ptr<QELPodcastSource> sourceOf(const std::vector<std::optional<int>>& dates) {
  auto episodes = std::make_shared<QELEpisodeList>();
  for (const auto& date : dates) {
    episodes->push_back(QELEpisode::episode());
    if (date) episodes->back()->setDate(platform::PointInTime(seconds(*date)));
  }
  auto source = std::make_unique<QELPodcastSource>();
  source->setEpisodes(std::move(episodes));
  return source;
}

using Wanted = std::vector<bool>;

TEST(QELSelectionTest, AllAreWantedAtFirst) {
  EXPECT_EQ(QELSelection().of(*sourceOf({3, std::nullopt, 1})), (Wanted{true, true, true}));
  EXPECT_EQ(QELSelection().of(QELPodcastSource()), Wanted());
}

TEST(QELSelectionTest, TheLatestGoByDate) {
  const auto source = sourceOf({1, std::nullopt, 3, 2, 2});
  EXPECT_EQ((QELSelection{.latest = 1, .since = std::nullopt}).of(*source),
            (Wanted{false, false, true, false, false}));
  EXPECT_EQ((QELSelection{.latest = 2, .since = std::nullopt}).of(*source),
            (Wanted{false, false, true, true, false}));
  EXPECT_EQ((QELSelection{.latest = 4, .since = std::nullopt}).of(*source),
            (Wanted{true, false, true, true, true}));
  EXPECT_EQ((QELSelection{.latest = 9, .since = std::nullopt}).of(*source),
            (Wanted{true, true, true, true, true}));
}

TEST(QELSelectionTest, SinceIsADateOrLater) {
  const auto source = sourceOf({1, std::nullopt, 3, 2});
  const platform::PointInTime date(seconds(2));
  EXPECT_EQ((QELSelection{.latest = std::nullopt, .since = date}).of(*source),
            (Wanted{false, false, true, true}));
  EXPECT_EQ((QELSelection{.latest = 1, .since = date}).of(*source),
            (Wanted{false, false, true, false}));
}

std::optional<std::int64_t> secondsOf(const std::string& text) {
  const auto date = QELDateOf(text);
  if (!date) return std::nullopt;
  return date->time_since_epoch() / seconds(1);
}

TEST(QELSelectionTest, DatesAreReadAsUsersWriteThem) {
  constexpr std::int64_t kMidnight = 1780185600;  // 2026-05-31 00:00:00 UTC
  EXPECT_EQ(secondsOf("2026-05-31"), kMidnight);
  EXPECT_EQ(secondsOf("2026-05-31T09:30:00Z"), kMidnight + 34200);
  EXPECT_EQ(secondsOf("2026-05-31t09:30:00z"), kMidnight + 34200);
  EXPECT_EQ(secondsOf("2026-05-31 09:30:00.75+02:00"), kMidnight + 34200 - 7200);
  EXPECT_EQ(secondsOf("2026-05-31T09:30:00-00:30"), kMidnight + 34200 + 1800);
  for (const char* text :
       {"", "2026", "2026-5-31", "2026-13-01", "2026-02-30", "31.05.2026", "2026-05-31T09:30",
        "2026-05-31T09:30:00", "2026-05-31T24:30:00Z", "2026-05-31T09:30:00+24:00",
        "2026-05-31T09:30:00+01:60", "2026-05-31T09:30:00+0100", "2026-05-31T09:30:00.Z",
        "2026-05-31T09:30:00ZZ", "2026-05-31 "}) {
    EXPECT_EQ(secondsOf(text), std::nullopt) << text;
  }
}

TEST(QELSelectionTest, ADayBeginsWhereTheUserLives) {
  ASSERT_EQ(setenv("TZ", "America/New_York", 1), 0);
  EXPECT_EQ(secondsOf("2026-05-31"), 1780185600 + 4 * 3600);
}

}  // namespace
