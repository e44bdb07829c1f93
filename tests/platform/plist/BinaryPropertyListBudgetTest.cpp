#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "platform/plist/BinaryPropertyListReader.h"
#include "tests/support/BinaryPropertyList.h"

namespace platform {
namespace {

constexpr const char* kTooLarge = "a binary property list whose shared objects make it too large";

/// The fault of reading the list; empty when there is none.
std::string faultOf(const std::string& bytes) {
  std::optional<PropertyListFault> fault;
  const auto read = readBinaryPropertyList(bytes, fault);
  EXPECT_NE(read.has_value(), fault.has_value());
  return fault ? fault->description : "";
}

/// Dictionaries that have one long key, each.
std::string dictionariesOfOneKey(std::size_t size, std::size_t count) {
  BinaryPropertyList list(4);
  const auto key = list.addText(std::string(size, 'k'));
  const auto value = list.addBytes("\x09");
  std::vector<std::uint64_t> entries;
  for (std::size_t i = 0; i < count; ++i) entries.push_back(list.addDictionary({key}, {value}));
  return list.bytes(list.addArray(entries));
}

/// A dictionary whose keys are texts of their own that lie over each other.
std::string overlappingKeys(std::size_t size, std::size_t count) {
  BinaryPropertyList list(4);
  std::vector<std::uint64_t> keys;
  for (std::size_t i = 0; i < count; ++i) {
    keys.push_back(list.addBytes("\x5F\x12" + bigEndian(size, 4)));
  }
  list.addBytes(std::string(size, 'k'));
  const std::vector<std::uint64_t> values(count, list.addBytes("\x09"));
  return list.bytes(list.addDictionary(keys, values));
}

TEST(BinaryPropertyListBudgetTest, SharedKeysAreCountedWhereverTheyStand) {
  EXPECT_EQ(faultOf(dictionariesOfOneKey(10'000, 600)), "");
  EXPECT_EQ(faultOf(dictionariesOfOneKey(10'000, 800)), kTooLarge);
}

TEST(BinaryPropertyListBudgetTest, OverlappingKeysAreCountedAsTextsToo) {
  for (const std::size_t size : {10'000U, 9'990U, 9'980U, 9'970U}) {
    EXPECT_EQ(faultOf(overlappingKeys(size, 300)), "");
    EXPECT_EQ(faultOf(overlappingKeys(size, 450)), kTooLarge);
  }
}

/// As many bytes, five for each of many objects or all but a few in one, and shared elements.
std::string objectsAndElements(bool areMany, std::size_t elements) {
  constexpr std::size_t kObjects = 20'000;
  BinaryPropertyList list(4);
  const auto shared = list.addBytes("\x09");
  if (areMany) {
    for (std::size_t i = 0; i < kObjects; ++i) list.addBytes("\x08");
  } else {
    list.addBytes("\x4F\x12" + bigEndian(kObjects * 5, 4) + std::string(kObjects * 5, 'x'));
  }
  return list.bytes(list.addArray(std::vector<std::uint64_t>(elements, shared)));
}

TEST(BinaryPropertyListBudgetTest, TheTableOfObjectsIsCounted) {
  std::size_t most = 0;
  for (std::size_t step = 1U << 20; step >= 100; step /= 2) {
    if (faultOf(objectsAndElements(false, most + step)).empty()) most += step;
  }
  EXPECT_EQ(faultOf(objectsAndElements(true, most / 2)), "");
  EXPECT_EQ(faultOf(objectsAndElements(true, most)), kTooLarge);
}

}  // namespace
}  // namespace platform
