#include "platform/text/ByteSource.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <memory>
#include <string>

namespace platform {
namespace {

const ErrorRecord kFailure = {"test", 1, "no more"};

/// The bytes as a reader gives them that reads a few at a time; it fails behind them where it is
/// to.
ByteSource read(std::string bytes, bool fails = false, std::size_t expectedSize = 0) {
  return {expectedSize,
          [bytes = std::move(bytes), fails](
              std::span<char> room, ErrorSlot& error) mutable -> std::optional<std::size_t> {
            constexpr std::size_t kFew = 3;
            if (bytes.empty() && fails) {
              error = kFailure;
              return std::nullopt;
            }
            const std::size_t size = bytes.copy(room.data(), std::min(room.size(), kFew));
            bytes.erase(0, size);
            return size;
          }};
}

/// Everything, read into rooms of that size; "failed" where it ends in that way.
std::string inRooms(ByteSource source, std::size_t size) {
  std::string all;
  std::string room(size, '\0');
  ErrorSlot error;
  while (const auto count = source.read(room, error)) {
    all.append(room, 0, *count);
    if (*count < size) return error ? "left an error" : all;
  }
  EXPECT_EQ(error, kFailure);
  return all + " failed";
}

TEST(ByteSourceTest, GivesItsBytesInRoomsOfAnySize) {
  for (const std::size_t size : {1U, 2U, 9U, 10U, 11U, 100U}) {
    EXPECT_EQ(inRooms(std::string("0123456789"), size), "0123456789") << size;
    EXPECT_EQ(inRooms(read("0123456789"), size), "0123456789") << size;
    EXPECT_EQ(inRooms(std::string(), size), "") << size;
    EXPECT_EQ(inRooms(read(""), size), "") << size;
  }
  EXPECT_EQ(inRooms(read("0123456789", true), 5), "0123456789 failed");
  EXPECT_EQ(inRooms(read("0123456789", true), 11), " failed");
}

TEST(ByteSourceTest, TheHeadIsStillToBeRead) {
  for (ByteSource source : {ByteSource(std::string("0123456789")), read("0123456789")}) {
    ErrorSlot error;
    EXPECT_EQ(source.head(error), "0123456789");
    EXPECT_EQ(source.head(error), "0123456789");
    EXPECT_EQ(inRooms(std::move(source), 7), "0123456789");
    EXPECT_EQ(error, std::nullopt);
  }
  const std::string large(100'000, 'x');
  ErrorSlot error;
  EXPECT_EQ(ByteSource(large).head(error), large);
  ByteSource source = read(large);
  EXPECT_EQ(source.head(error), large.substr(0, 65536));
  EXPECT_EQ(inRooms(std::move(source), 70'000), large);
  EXPECT_EQ(read("").head(error), "");
  EXPECT_EQ(error, std::nullopt);
  EXPECT_EQ(read("01", true).head(error), "");
  EXPECT_EQ(error, kFailure);
}

TEST(ByteSourceTest, GivesAllAtOnceWhateverItsSizeWasExpectedToBe) {
  const std::string bytes(100'000, 'x');
  ErrorSlot error;
  EXPECT_EQ(ByteSource(bytes).readAll(error), bytes);
  for (const std::size_t expectedSize : {0U, 1U, 99'999U, 100'000U, 100'001U}) {
    EXPECT_EQ(read(bytes, false, expectedSize).readAll(error), bytes) << expectedSize;
  }
  ByteSource source = read(bytes);
  EXPECT_EQ(source.head(error).size(), 65536U);
  EXPECT_EQ(source.readAll(error), bytes);
  EXPECT_EQ(error, std::nullopt);
  EXPECT_EQ(read(bytes, true).readAll(error), std::nullopt);
  EXPECT_EQ(error, kFailure);
}

TEST(ByteSourceTest, KnowsWhichSizeToExpect) {
  EXPECT_EQ(ByteSource(std::string("abc")).expectedSize(), 3U);
  EXPECT_EQ(read("abc", false, 5).expectedSize(), 5U);
}

}  // namespace
}  // namespace platform
