#include "companions/publish/QELRemarks.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using testing::ElementsAre;

TEST(QELRemarksTest, KindsStandInTheOrderInWhichTheyWereMet) {
  QELRemarks remarks;
  EXPECT_TRUE(remarks.lines().empty());
  remarks.add("late");
  remarks.add("no date", "one");
  remarks.add("late");
  remarks.add("no type", "one");
  remarks.add("no date", "two");
  EXPECT_THAT(remarks.lines(), ElementsAre("late", "no date: one and two", "no type: one"));
}

TEST(QELRemarksTest, ThreePartsAreNamedAndTheOthersCounted) {
  QELRemarks remarks;
  for (const char* part : {"a", "b", "c"}) remarks.add("x", part);
  EXPECT_THAT(remarks.lines(), ElementsAre("x: a, b and c"));
  remarks.add("x", "d");
  EXPECT_THAT(remarks.lines(), ElementsAre("x: a, b, c and 1 more"));
  remarks.add("x", "e");
  EXPECT_THAT(remarks.lines(), ElementsAre("x: a, b, c and 2 more"));
}

}  // namespace
