#include "platform/xml/MemoryBudget.h"

#include <gtest/gtest.h>

#include <string>

namespace platform {
namespace {

/// What is left of the budget.
std::uint64_t leftOf(MemoryBudget& budget) {
  std::uint64_t left = 0;
  while (budget.take(1)) ++left;
  return left;
}

TEST(MemoryBudgetTest, TakesWhatIsThereAndNothingMore) {
  MemoryBudget budget(10);
  EXPECT_TRUE(budget.take(4));
  EXPECT_FALSE(budget.take(7));
  budget.give(1);
  EXPECT_TRUE(budget.take(7));
  EXPECT_FALSE(budget.take(1));
  EXPECT_TRUE(budget.take(0));
}

TEST(MemoryBudgetTest, RecordsAndFieldsCount) {
  MemoryBudget budget(1000);
  EXPECT_TRUE(budget.takeRecords(2));
  EXPECT_TRUE(budget.takeRecords());
  EXPECT_FALSE(budget.takeRecords(2));
  EXPECT_TRUE(budget.takeFields());
  EXPECT_FALSE(budget.takeFields());
  EXPECT_EQ(leftOf(budget), 1000U - 3 * 208 - 192);
}

TEST(MemoryBudgetTest, TextsCountAsTheyAreWritten) {
  const struct {
    const char* text;
    std::uint64_t size;
  } rows[] = {
      {"", 0},     {"plain", 10}, {"\u00E9", 4}, {"&", 18},  // "&amp;"
      {"\"", 22},                                            // "&quot;"
      {"\r", 18},                                            // "&#13;"
      {"\x01", 2},
  };
  for (const auto& row : rows) {
    MemoryBudget budget(100);
    EXPECT_TRUE(budget.takeWritten(row.text));
    EXPECT_EQ(leftOf(budget), 100 - row.size) << row.text;
  }
}

}  // namespace
}  // namespace platform
