#include "platform/text/AtomicValue.h"

#include <gtest/gtest.h>

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

TEST(AtomicValueTest, ThreadsReadAndWriteWholeValues) {
  platform::AtomicValue<std::string> value;
  std::vector<std::thread> threads;
  for (char letter = 'a'; letter < 'e'; ++letter) {
    threads.emplace_back([&value, letter] {
      const std::string mine(40, letter);
      for (int round = 0; round < 2000; ++round) {
        value.store(mine);
        const std::string seen = value.load();
        ASSERT_EQ(seen, std::string(40, seen.front()));
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
}

}  // namespace
