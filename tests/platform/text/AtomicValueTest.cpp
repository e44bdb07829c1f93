#include "platform/text/AtomicValue.h"

#include <gtest/gtest.h>

#include <chrono>
#include <string>
#include <thread>
#include <vector>

namespace {

TEST(AtomicValueTest, HoldsWhatWasStoredLast) {
  platform::AtomicValue<std::string> value;
  EXPECT_EQ(value.load(), "");
  value.store("one");
  value.store("two");
  EXPECT_EQ(value.load(), "two");
}

TEST(AtomicValueTest, LoadedValueStaysWhenAnotherIsStored) {
  platform::AtomicValue<std::string> value;
  value.store("one");
  const std::string loaded = value.load();
  value.store("two");
  EXPECT_EQ(loaded, "one");
}

/// Lets other threads run in the middle of every copy.
struct TwoHalves {
  explicit TwoHalves(int number = 0) : first(number), second(number) {}
  TwoHalves(const TwoHalves& other) { *this = other; }
  TwoHalves& operator=(const TwoHalves& other) {
    first = other.first;
    std::this_thread::sleep_for(std::chrono::microseconds(100));
    second = other.second;
    return *this;
  }
  ~TwoHalves() = default;

  int first = 0;
  int second = 0;
};

TEST(AtomicValueTest, ThreadsReadAndWriteWholeValues) {
  platform::AtomicValue<TwoHalves> value;
  std::vector<std::thread> threads;
  for (int number = 0; number < 4; ++number) {
    threads.emplace_back([&value, number] {
      for (int round = 0; round < 50; ++round) {
        value.store(TwoHalves(number));
        const TwoHalves seen = value.load();
        ASSERT_EQ(seen.first, seen.second);
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
}

}  // namespace
