#include "platform/text/AtomicTexts.h"

#include <gtest/gtest.h>

#include <string>
#include <thread>
#include <vector>

namespace platform {
namespace {

TEST(AtomicTextsTest, HoldsWhatWasStoredLast) {
  AtomicTexts<3> texts;
  EXPECT_EQ(texts.load(0), std::nullopt);
  texts.store(2, "c");
  texts.store(0, "");
  texts.store(1, "b");
  EXPECT_EQ(texts.load(0), "");
  EXPECT_EQ(texts.load(1), "b");
  EXPECT_EQ(texts.load(2), "c");

  texts.store(1, std::nullopt);
  texts.store(1, std::nullopt);
  texts.store(2, "d");
  EXPECT_EQ(texts.load(0), "");
  EXPECT_EQ(texts.load(1), std::nullopt);
  EXPECT_EQ(texts.load(2), "d");
}

TEST(AtomicTextsTest, AllAreStoredTogether) {
  AtomicTexts<4> texts;
  texts.store(0, "a");
  texts.storeAll({std::nullopt, "b", std::nullopt, "d"});
  EXPECT_EQ(texts.load(0), std::nullopt);
  EXPECT_EQ(texts.load(1), "b");
  EXPECT_EQ(texts.load(2), std::nullopt);
  EXPECT_EQ(texts.load(3), "d");
  texts.storeAll({});
  EXPECT_EQ(texts.load(3), std::nullopt);
}

TEST(AtomicTextsTest, LoadedTextStaysWhenAnotherIsStored) {
  AtomicTexts<1> texts;
  texts.store(0, "one");
  const OptionalText loaded = texts.load(0);
  texts.store(0, "two");
  texts.store(0, std::nullopt);
  EXPECT_EQ(loaded, "one");
}

TEST(AtomicTextsTest, AbsentTextsTakeNoRoom) {
  EXPECT_LE(sizeof(AtomicTexts<16>), 3 * sizeof(void*));
}

// Meant for the thread sanitizer; without it, half-made texts show as a wrong one or a crash.
TEST(AtomicTextsTest, ThreadsReadAndWriteWholeTexts) {
  AtomicTexts<4> texts;
  std::vector<std::thread> threads;
  for (std::size_t index = 0; index < 4; ++index) {
    threads.emplace_back([&texts, index] {
      const std::string own(100, static_cast<char>('a' + index));
      for (int round = 0; round < 2000; ++round) {
        texts.store(index, Text(own));
        ASSERT_EQ(texts.load(index), own);
        texts.store(index, std::nullopt);
        ASSERT_EQ(texts.load(index), std::nullopt);
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
}

}  // namespace
}  // namespace platform
