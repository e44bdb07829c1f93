#include "platform/plist/PropertyListDictionary.h"

#include <gtest/gtest.h>

#include <string>
#include <utility>

#include "platform/plist/PropertyListValue.h"
#include "tests/support/PropertyListDump.h"

namespace platform {
namespace {

std::string shown(const Dictionary& dictionary) {
  return dumped(PropertyListValue(dictionary));
}

PropertyListValue number(std::int64_t value) {
  return value;
}

TEST(PropertyListDictionaryTest, EmptyDictionary) {
  Dictionary dictionary;
  EXPECT_TRUE(dictionary.empty());
  EXPECT_EQ(dictionary.size(), 0U);
  EXPECT_EQ(dictionary.begin(), dictionary.end());
  EXPECT_EQ(dictionary.find(""), dictionary.end());
  dictionary.erase("a");
  EXPECT_EQ(dictionary, Dictionary());
}

TEST(PropertyListDictionaryTest, EntriesStandInTheOrderOfTheirKeysBytes) {
  Dictionary dictionary;
  for (const char* key : {"b", "a", "ab", "", "\xC3\xA4", "Z"}) dictionary.emplace(key, key);
  EXPECT_EQ(shown(dictionary), R"({"": "", "Z": "Z", "a": "a", "ab": "ab", "b": "b", "ä": "ä"})");
  EXPECT_EQ(dictionary.size(), 6U);
  EXPECT_FALSE(dictionary.empty());
}

TEST(PropertyListDictionaryTest, OfManyEntriesTheLastOfAKeyCounts) {
  const Dictionary dictionary(Dictionary::Entries{
      {"b", number(1)}, {"a", number(2)}, {"b", number(3)}, {"c", number(4)}, {"b", number(5)}});
  EXPECT_EQ(shown(dictionary), R"({"a": 2, "b": 5, "c": 4})");
  // In order but for a key that stands twice.
  EXPECT_EQ(shown(Dictionary{{"a", number(1)}, {"a", number(2)}}), R"({"a": 2})");
}

TEST(PropertyListDictionaryTest, EveryEntryOfManyIsFound) {
  Dictionary::Entries entries;
  for (int i = 0; i < 1000; ++i) entries.push_back({std::to_string(i * 7919 % 1000), number(i)});
  const Dictionary dictionary(std::move(entries));
  EXPECT_EQ(dictionary.size(), 1000U);
  for (int i = 0; i < 1000; ++i) {
    const auto* const found = dictionary.find(std::to_string(i * 7919 % 1000));
    ASSERT_NE(found, dictionary.end());
    EXPECT_EQ(found->second, number(i));
  }
  EXPECT_EQ(dictionary.find("1000"), dictionary.end());
}

TEST(PropertyListDictionaryTest, FindsOnlyTheKeyItself) {
  const Dictionary dictionary{{"b", "x"}, {"d", "y"}};
  EXPECT_EQ(dictionary.find("b")->second, PropertyListValue("x"));
  EXPECT_EQ(dictionary.find("d")->second, PropertyListValue("y"));
  for (const char* key : {"", "a", "bb", "c", "e"}) {
    EXPECT_EQ(dictionary.find(key), dictionary.end()) << key;
  }
}

TEST(PropertyListDictionaryTest, EmplaceKeepsTheValueThatIsThere) {
  Dictionary dictionary{{"a", "first"}, {"c", "last"}};
  dictionary.emplace("a", "second");
  dictionary.emplace("c", "second");
  dictionary.emplace("b", "new");
  dictionary.emplace("d", "new");
  EXPECT_EQ(shown(dictionary), R"({"a": "first", "b": "new", "c": "last", "d": "new"})");
}

TEST(PropertyListDictionaryTest, InsertOrAssignReplacesTheValueThatIsThere) {
  Dictionary dictionary{{"b", "first"}};
  dictionary.insert_or_assign("b", "second");
  dictionary.insert_or_assign("a", "new");
  dictionary.insert_or_assign("c", "new");
  EXPECT_EQ(shown(dictionary), R"({"a": "new", "b": "second", "c": "new"})");
}

TEST(PropertyListDictionaryTest, ErasesOneEntry) {
  Dictionary dictionary{{"a", "1"}, {"b", "2"}, {"c", "3"}};
  dictionary.erase("b");
  dictionary.erase("bb");
  EXPECT_EQ(shown(dictionary), R"({"a": "1", "c": "3"})");
}

TEST(PropertyListDictionaryTest, CopiesAreTheirOwn) {
  Dictionary dictionary{{"a", "1"}};
  Dictionary copy = dictionary;
  copy.insert_or_assign("a", "2");
  EXPECT_NE(copy, dictionary);
  EXPECT_EQ(shown(dictionary), R"({"a": "1"})");
  copy = dictionary;
  EXPECT_EQ(copy, dictionary);
  const Dictionary moved = std::move(copy);
  EXPECT_EQ(moved, dictionary);
}

TEST(PropertyListDictionaryTest, ReservingChangesNothing) {
  Dictionary dictionary{{"a", "1"}};
  dictionary.reserve(100);
  EXPECT_EQ(shown(dictionary), R"({"a": "1"})");
}

}  // namespace
}  // namespace platform
