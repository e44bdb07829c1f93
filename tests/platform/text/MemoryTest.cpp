#include "platform/text/Memory.h"

#include <gtest/gtest.h>
#include <sys/resource.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <new>
#include <string_view>

// A sanitizer has an allocator of its own, which ends the process unless it is told otherwise.
// NOLINTBEGIN(bugprone-reserved-identifier,readability-identifier-naming)
extern "C" const char* __asan_default_options() {
  return "allocator_may_return_null=1";
}
extern "C" const char* __tsan_default_options() {
  return "allocator_may_return_null=1";
}
// NOLINTEND(bugprone-reserved-identifier,readability-identifier-naming)

namespace platform {
namespace {

constexpr std::size_t kTooMuch = SIZE_MAX;

// Called twice, it gives up, which lets the caller see the refusal.
int calls = 0;
void giveUpSecondTime() {
  if (++calls == 2) std::set_new_handler(nullptr);
}

class MemoryTest : public ::testing::Test {
 protected:
  ~MemoryTest() override { std::set_new_handler(nullptr); }

  /// How often the new-handler is called before the refusal is told.
  template <typename Request>
  int callsDuring(Request request) {
    calls = 0;
    std::set_new_handler(&giveUpSecondTime);
    EXPECT_EQ(request(), nullptr);
    return calls;
  }
};

TEST_F(MemoryTest, RefusedMemoryIsTheNewHandlersMatterAsLongAsThereIsOne) {
  EXPECT_EQ(callsDuring([] { return Memory::allocate(kTooMuch); }), 2);
  EXPECT_EQ(callsDuring([] { return Memory::allocateZeroed(kTooMuch, 2); }), 2);
  void* const block = Memory::allocate(1);
  EXPECT_EQ(callsDuring([&] { return Memory::reallocate(block, kTooMuch); }), 2);
  Memory::release(block);
}

TEST_F(MemoryTest, WhatTheNewHandlerFreesIsAskedForAgain) {
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
  GTEST_SKIP() << "a sanitizer reserves more memory than any limit";
#endif
  constexpr std::size_t kSize = std::size_t{1} << 30U;
  const auto request = [] {
    rlimit limit{};
    ::getrlimit(RLIMIT_AS, &limit);
    limit.rlim_cur = kSize;
    ::setrlimit(RLIMIT_AS, &limit);
    std::set_new_handler([] {
      std::set_new_handler(nullptr);
      rlimit lifted{};
      ::getrlimit(RLIMIT_AS, &lifted);
      lifted.rlim_cur = lifted.rlim_max;
      ::setrlimit(RLIMIT_AS, &lifted);
    });
    const void* const block = Memory::allocate(kSize);
    std::exit(block != nullptr && std::get_new_handler() == nullptr ? 0 : 1);
  };
  EXPECT_EXIT(request(), testing::ExitedWithCode(0), "");
}

TEST_F(MemoryTest, BlocksHoldWhatTheyShould) {
  void* block = Memory::duplicate("text");
  EXPECT_STREQ(static_cast<char*>(block), "text");
  block = Memory::reallocate(block, 100'000);
  EXPECT_STREQ(static_cast<char*>(block), "text");
  Memory::release(block);
  block = Memory::allocateZeroed(2, 3);
  EXPECT_EQ(std::string_view(static_cast<char*>(block), 6), std::string_view("\0\0\0\0\0\0", 6));
  Memory::release(block);
}

TEST_F(MemoryTest, EmptyBlocksAreNoRefusals) {
  std::set_new_handler([] { FAIL(); });
  void* block = Memory::allocate(0);
  block = Memory::reallocate(block, 0);
  EXPECT_NE(block, nullptr);
  Memory::release(block);
  block = Memory::allocateZeroed(0, 0);
  EXPECT_NE(block, nullptr);
  Memory::release(block);
}

}  // namespace
}  // namespace platform
