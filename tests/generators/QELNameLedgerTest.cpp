#include "generators/QELNameLedger.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>
#include <functional>
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
  const struct {
    std::vector<std::string> asked;
    std::vector<std::string> given;
  } rows[] = {
      {{"a", "b"}, {"a", "b"}},
      {{"a", "a", "a"}, {"a", "a-2", "a-3"}},
      {{"show", "show", "SHOW"}, {"show", "show-2", "SHOW"}},
      {{"a-2", "a", "a"}, {"a-2", "a", "a-3"}},
      {{"a", "a", "a-2"}, {"a", "a-2", "a-2-2"}},
      {{"a", "a-3", "a", "a", "a"}, {"a", "a-3", "a-2", "a-4", "a-5"}},
      {{"a", "a-2", "a-2", "a"}, {"a", "a-2", "a-2-2", "a-3"}},
      {{"", "", ""}, {"", "-2", "-3"}},
  };
  for (const auto& row : rows) EXPECT_EQ(reserveAll(row.asked), row.given) << row.asked.front();
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

/// What the hash of the standard library, MurmurHash64A, does to each 8 bytes of a text, undone.
std::string bytesHashedAs(std::uint64_t mixed) {
  constexpr std::uint64_t kFactor = 0xc6a4a7935bd1e995;
  std::uint64_t inverse = kFactor;
  for (int step = 0; step < 6; ++step) inverse *= 2 - kFactor * inverse;
  std::uint64_t block = mixed * inverse;
  block ^= block >> 47U;
  block *= inverse;
  std::string bytes(sizeof(block), '\0');
  std::memcpy(bytes.data(), &block, sizeof(block));
  return bytes;
}

/// 2^doublings names of one hash: a change of the highest bit in two successive blocks cancels out.
std::vector<std::string> collidingNames(unsigned doublings) {
  constexpr std::uint64_t kHighestBit = std::uint64_t{1} << 63U;
  std::vector<std::string> names{""};
  for (std::uint64_t pair = 0; pair < doublings; ++pair) {
    const std::string one = bytesHashedAs(2 * pair) + bytesHashedAs(2 * pair + 1);
    const std::string other =
        bytesHashedAs(2 * pair ^ kHighestBit) + bytesHashedAs((2 * pair + 1) ^ kHighestBit);
    std::vector<std::string> longer;
    for (const std::string& name : names) {
      longer.push_back(name + one);
      longer.push_back(name + other);
    }
    names = std::move(longer);
  }
  return names;
}

// In a hash table this takes minutes, more than the test may.
TEST(QELNameLedgerTest, NamesMadeToHashAlikeCostNoMore) {
  const std::vector<std::string> names = collidingNames(18);
#if defined(__GLIBCXX__) && SIZE_MAX > UINT32_MAX  // whose hash the names are made for
  for (const std::string& name : names) {
    ASSERT_EQ(std::hash<std::string>()(name), std::hash<std::string>()(names.front()));
  }
#endif
  EXPECT_EQ(reserveAll(names), names);
}

}  // namespace
