#include "generators/QELNameLedger.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

std::vector<std::string> reserveAll(const std::vector<std::string>& names) {
  QELNameLedger ledger;
  std::vector<std::string> reserved;
  reserved.reserve(names.size());
  for (const std::string& name : names) reserved.push_back(ledger.reserve(name));
  return reserved;
}

TEST(QELNameLedgerTest, Reservations) {
  struct Row {
    std::vector<std::string> asked;
    std::vector<std::string> given;
  };
  const Row rows[] = {
      {{"a", "b"}, {"a", "b"}},
      {{"a", "a", "a"}, {"a", "a-2", "a-3"}},
      {{"show", "show", "SHOW"}, {"show", "show-2", "SHOW"}},
      {{"a-2", "a", "a"}, {"a-2", "a", "a-3"}},
      {{"a", "a", "a-2"}, {"a", "a-2", "a-2-2"}},
      {{"a", "a-3", "a", "a", "a"}, {"a", "a-3", "a-2", "a-4", "a-5"}},
      {{"a", "a-2", "a-2", "a"}, {"a", "a-2", "a-2-2", "a-3"}},
      {{"", "", ""}, {"", "-2", "-3"}},
  };
  for (const Row& row : rows) EXPECT_EQ(reserveAll(row.asked), row.given) << row.asked.front();
}

TEST(QELNameLedgerTest, ManyEpisodesOfOneName) {
  constexpr int kCount = 200000;
  QELNameLedger ledger;
  std::string last;
  for (int count = 0; count < kCount; ++count) last = ledger.reserve("audio");
  EXPECT_EQ(last, "audio-200000");
}

TEST(QELNameLedgerTest, NumbersTakenBeforehandAreSkippedOnce) {
  constexpr int kCount = 50000;
  QELNameLedger ledger;
  for (int number = 2; number <= kCount; ++number) ledger.reserve("a-" + std::to_string(number));
  EXPECT_EQ(ledger.reserve("a"), "a");
  EXPECT_EQ(ledger.reserve("a"), "a-50001");
  EXPECT_EQ(ledger.reserve("a"), "a-50002");
}

}  // namespace
