#include "companions/common/QELTransferDisplay.h"

#include <gtest/gtest.h>

#include <vector>

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;
using Time = std::chrono::steady_clock::time_point;

const Time kStart{seconds(1000)};

QELTransferState state(std::string title, std::uint64_t received,
                       std::optional<std::uint64_t> total, std::uint64_t resumed = 0) {
  QELTransferState made;
  made.title = std::move(title);
  made.received = received;
  made.resumed = resumed;
  made.total = total;
  made.start = kStart;
  return made;
}

/// What a display showed.
class Screen {
 public:
  explicit Screen(std::optional<std::size_t> columns)
      : display(columns, [this](std::string_view text) {
          shown_ += text;
          return true;
        }) {}

  /// What was shown since this was asked last.
  std::string take() { return std::exchange(shown_, ""); }

 private:
  std::string shown_;

 public:
  QELTransferDisplay display;
};

std::string drawn(const QELTransferState& transfer, Time now, std::size_t columns = 81) {
  Screen screen(columns);
  screen.display.draw(std::vector{transfer}, "", now);
  const std::string shown = screen.take();
  return shown.substr(0, shown.find('\n'));
}

TEST(QELTransferDisplayTest, ALineHasABarASpeedAndTheTimeLeft) {
  const Time now = kStart + seconds(2);
  EXPECT_EQ(drawn(state("\"Pilot\"", 3000000, 6000000), now),
            "\"Pilot\"                      [##########----------]   50%     1.5 MB/s      0:02");
  EXPECT_EQ(drawn(state("\"Pilot\"", 0, 6000000), now),
            "\"Pilot\"                      [--------------------]    0%        0 B/s     --:--");
  EXPECT_EQ(drawn(state("\"Pilot\"", 6000000, 6000000), now),
            "\"Pilot\"                      [####################]  100%     3.0 MB/s      0:00");
}

TEST(QELTransferDisplayTest, ASpeedIsOfWhatCameInThisTry) {
  EXPECT_EQ(drawn(state("A", 3000000, 4000000, 1000000), kStart + seconds(2)),
            "A                            [###############-----]   75%     1.0 MB/s      0:01");
}

TEST(QELTransferDisplayTest, MoreThanAnnouncedIsAll) {
  EXPECT_EQ(drawn(state("A", 3000, 2000), kStart + seconds(1)),
            "A                            [####################]  100%     3.0 kB/s      0:00");
}

TEST(QELTransferDisplayTest, WithoutALengthThereIsNoBar) {
  EXPECT_EQ(drawn(state("A", 3000, std::nullopt), kStart + seconds(3)),
            "A                                                  3.0 kB     1.0 kB/s          ");
}

TEST(QELTransferDisplayTest, OfNothingThereIsNoShare) {
  EXPECT_EQ(drawn(state("A", 0, 0), kStart + seconds(3)),
            "A                                                     0 B        0 B/s          ");
}

TEST(QELTransferDisplayTest, LongTimesHaveHours) {
  EXPECT_EQ(drawn(state("A", 1000, 3725000 + 1000), kStart + seconds(1)).substr(70), "   1:02:05");
  EXPECT_EQ(drawn(state("A", 1000, 4199000 + 1000), kStart + seconds(1)).substr(70), "   1:09:59");
  EXPECT_EQ(drawn(state("A", 1000, 4200000 + 1000), kStart + seconds(1)).substr(70), "   1:10:00");
  EXPECT_EQ(drawn(state("A", 1, 360'000), kStart + seconds(1)).substr(70), "  99:59:59");
  EXPECT_EQ(drawn(state("A", 1, 360'001), kStart + seconds(1)).substr(70), "     --:--");
  EXPECT_EQ(drawn(state("A", 1, 400000), kStart + seconds(1)).substr(70), "     --:--");
}

TEST(QELTransferDisplayTest, NarrowTerminalsGetNoLongerLines) {
  EXPECT_EQ(drawn(state("A", 1000, 2000), kStart + seconds(1), 21), " [##########--------");
}

TEST(QELTransferDisplayTest, WhatWasDrawnGoesBeforeOtherLines) {
  Screen screen(20);
  EXPECT_TRUE(screen.display.wantsDrawing(kStart));
  screen.display.draw(std::vector<QELTransferState>{}, "0 of 2", kStart);
  EXPECT_EQ(screen.take(), "0 of 2             \n");
  EXPECT_FALSE(screen.display.wantsDrawing(kStart + milliseconds(199)));
  EXPECT_TRUE(screen.display.wantsDrawing(kStart + milliseconds(200)));
  screen.display.draw(std::vector{state("A", 0, 1), state("B", 0, 1)}, "1 of 2", kStart);
  EXPECT_TRUE(screen.take().starts_with("\x1B[1F\x1B[J"));
  screen.display.print("a line");
  EXPECT_EQ(screen.take(), "\x1B[3F\x1B[Ja line\n");
  EXPECT_TRUE(screen.display.wantsDrawing(kStart));
  screen.display.clear();
  EXPECT_EQ(screen.take(), "");
}

TEST(QELTransferDisplayTest, InPipesThereAreLinesAlone) {
  Screen screen(std::nullopt);
  EXPECT_FALSE(screen.display.wantsDrawing(kStart));
  screen.display.draw(std::vector{state("A", 0, 1)}, "1 of 2", kStart);
  screen.display.print(
      "a\x1B"
      "b");
  EXPECT_EQ(screen.take(), "a\uFFFDb\n");
}

TEST(QELTransferDisplayTest, NoLineSteersATerminal) {
  Screen screen(20);
  screen.display.print(
      "a\x1B"
      "b");
  EXPECT_EQ(screen.take(), "a\uFFFDb\n");
}

TEST(QELTransferDisplayTest, SizesAreForPeople) {
  EXPECT_EQ(QELSizeText(0), "0 B");
  EXPECT_EQ(QELSizeText(999), "999 B");
  EXPECT_EQ(QELSizeText(1000), "1.0 kB");
  EXPECT_EQ(QELSizeText(999949), "999.9 kB");
  EXPECT_EQ(QELSizeText(999950), "1.0 MB");
  EXPECT_EQ(QELSizeText(12345678), "12.3 MB");
  EXPECT_EQ(QELSizeText(5000000000), "5.0 GB");
  EXPECT_EQ(QELSizeText(5000000000000000), "5000.0 TB");
}

}  // namespace
