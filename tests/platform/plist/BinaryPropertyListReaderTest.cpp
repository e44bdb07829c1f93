#include "platform/plist/BinaryPropertyListReader.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "tests/support/BinaryPropertyList.h"
#include "tests/support/PropertyListDump.h"
#include "tests/support/XMLEventRecorder.h"
namespace platform {
namespace {

using namespace std::string_literals;

/// A list whose root is the one object.
std::string single(std::string object) {
  BinaryPropertyList list;
  return list.bytes(list.addBytes(std::move(object)));
}

/// The list with one of its trailer's fields, which is that many bytes before the end, changed.
std::string withTrailerField(std::string bytes, std::size_t fromEnd, std::string_view field) {
  return bytes.replace(bytes.size() - fromEnd, field.size(), field);
}

TEST(BinaryPropertyListReaderTest, ReadsEveryKindOfBinaryObject) {
  expectOutcomes({
      {"false", single("\x08"), "false"},
      {"true", single("\x09"), "true"},
      {"integer of 1 byte", single("\x10\xFF"), "255"},
      {"integer of 2 bytes", single("\x11\xFF\xFE"), "65534"},
      {"integer of 4 bytes", single("\x12\xFF\xFF\xFF\xFF"), "4294967295"},
      {"integer of 8 bytes", single("\x13\x01\x02\x03\x04\x05\x06\x07\x08"), "72623859790382856"},
      {"negative integer", single("\x13" + std::string(7, '\xFF') + "\xFB"), "-5"},
      {"unsigned integer", single("\x14" + std::string(8, '\0') + std::string(8, '\xFF')),
       "18446744073709551615u"},
      {"negative integer of 16 bytes", single("\x14" + std::string(16, '\xFF')), "-1"},
      {"real of 4 bytes", single("\x22\x3F\xC0\0\0"s), "1.5r"},
      {"real of 8 bytes", single("\x23\xC0\x04\0\0\0\0\0\0"s), "-2.5r"},
      {"date", single("\x33" + std::string(8, '\0')), "2001-01-01T00:00:00.000"},
      {"date with a fraction", single("\x33\x3F\xD0\0\0\0\0\0\0"s), "2001-01-01T00:00:00.250"},
      {"date before", single("\x33\xBF\xF0\0\0\0\0\0\0"s), "2000-12-31T23:59:59.000"},
      {"data", single("\x43\x00\x01\xFF"s), "<0001ff>"},
      {"empty data", single("\x40"), "<>"},
      {"text",
       single("\x53"
              "abc"),
       "\"abc\""},
      {"empty text", single("\x50"), "\"\""},
      {"long text", single("\x5F\x10\x10" + std::string(16, 'x')), "\"xxxxxxxxxxxxxxxx\""},
      {"count of 2 bytes", single("\x5F\x11\0\x02xy"s), "\"xy\""},
      {"count of 4 bytes", single("\x5F\x12\0\0\0\x02xy"s), "\"xy\""},
      {"bytes over 127 in ASCII",
       single("\x53"
              "a\xE9"
              "b"),
       "\"a\xEF\xBF\xBD"
       "b\""},
      {"UTF-16", single("\x65\x00\x61\x00\xE9\x20\xAC\xD8\x3C\xDF\x99"s),
       "\"a\xC3\xA9\xE2\x82\xAC\xF0\x9F\x8E\x99\""},
      {"lone surrogates", single("\x64\xD8\x3C\x00\x61\xDF\x99\xD8\x3C"s),
       "\"\xEF\xBF\xBD"
       "a\xEF\xBF\xBD\xEF\xBF\xBD\""},
      {"text that starts with a byte order mark", single("\x62\xFE\xFF\x00\x61"s),
       "\"\xEF\xBB\xBF"
       "a\""},
      {"UTF-8",
       single("\x73"
              "a\xC3\xA9"),
       "\"a\xC3\xA9\""},
      {"malformed UTF-8",
       single("\x72"
              "a\xC3"),
       "\"a\xEF\xBF\xBD\""},
      {"empty array", single("\xA0"), "[]"},
      {"empty set", single("\xC0"), "[]"},
      {"empty ordered set", single("\xB0"), "[]"},
      {"empty dictionary", single("\xD0"), "{}"},
  });
}

TEST(BinaryPropertyListReaderTest, ReadsBinaryContainers) {
  for (const std::size_t width : {1U, 2U, 3U, 8U}) {
    BinaryPropertyList list(width);
    const auto name = list.addText("EpisodeName");
    const auto order = list.addText("EpisodeOrder");
    const auto pilot = list.addText("Pilot");
    const auto one = list.addBytes("\x10\x01");
    const auto episode = list.addDictionary({order, name}, {one, pilot});
    const auto untitled = list.addDictionary({order}, {one});
    const auto episodes = list.addArray({episode, untitled, pilot});
    const auto key = list.addText("Episodes");
    const auto root = list.addDictionary({key}, {episodes});
    EXPECT_EQ(readOutcome(list.bytes(root)),
              "{\"Episodes\": [{\"EpisodeName\": \"Pilot\", \"EpisodeOrder\": 1}, "
              "{\"EpisodeOrder\": 1}, \"Pilot\"]}")
        << width;
  }
}

TEST(BinaryPropertyListReaderTest, TheLastOfTwoBinaryKeysCounts) {
  BinaryPropertyList list;
  const auto key = list.addText("a");
  const auto no = list.addBytes("\x08");
  const auto yes = list.addBytes("\x09");
  EXPECT_EQ(readOutcome(list.bytes(list.addDictionary({key, key}, {no, yes}))), "{\"a\": true}");
}

TEST(BinaryPropertyListReaderTest, BinaryListsShareTheirTexts) {
  BinaryPropertyList list;
  const auto text = list.addText(std::string(1000, 'x'));
  std::optional<PropertyListFault> fault;
  const auto value =
      readPropertyList(list.bytes(list.addArray(std::vector<std::uint64_t>(200, text))), fault);
  ASSERT_TRUE(value) << fault->description;
  const auto& array = *value->asArray();
  ASSERT_EQ(array.size(), 200U);
  EXPECT_EQ(array.front().asText()->view().data(), array.back().asText()->view().data());
}

TEST(BinaryPropertyListReaderTest, RefusesMalformedBinaryObjects) {
  const std::string refused = "object 0: an object ";
  const std::string cut = refused + "that is cut or of an unknown kind";
  const std::string cutContainer = "object 0: an array or dictionary that is cut";
  const std::string count = refused + "with a malformed count";
  expectOutcomes({
      {"null", single("\0"s), cut},
      {"fill", single("\x0F"), cut},
      {"UID", single("\x80\x01"), cut},
      {"unused marker", single("\xE0"), cut},
      {"last marker", single("\xFF\x10\x00"s), cut},
      {"cut integer", single("\x13\x01"), cut},
      {"integer of 32 bytes", single("\x15" + std::string(32, '\0')), cut},
      {"positive integer beyond 64 bits",
       single("\x14" + std::string(7, '\0') + "\x01" + std::string(8, '\0')), cut},
      {"negative integer beyond 64 bits",
       single("\x14" + std::string(8, '\xFF') + std::string(8, '\0')), cut},
      {"cut real", single("\x23\x01"), cut},
      {"real of 2 bytes", single("\x21\x01\x01"), cut},
      {"real of 16 bytes", single("\x24" + std::string(16, '\0')), cut},
      {"cut date", single("\x33\x01"), cut},
      {"date of 4 bytes", single("\x32" + std::string(4, '\0')), cut},
      {"date that is no number", single("\x33\x7F\xF8\0\0\0\0\0\0"s), cut},
      {"infinite date", single("\x33\x7F\xF0\0\0\0\0\0\0"s), cut},
      {"date too far away", single("\x33\x43\x43\0\0\0\0\0\0"s), cut},
      {"date too long ago", single("\x33\xC3\x43\0\0\0\0\0\0"s), cut},
      {"cut data", single("\x42x"), cut},
      {"cut text", single("\x52x"), cut},
      {"cut UTF-16", single("\x62\0a\0"s), cut},
      {"text of 2^63 bytes", single("\x5F\x13\x80\0\0\0\0\0\0\0x"s), cut},
      {"UTF-16 of 2^63 units", single("\x6F\x13\x80\0\0\0\0\0\0\0x"s), cut},
      {"data of 2^64-1 bytes", single("\x4F\x13" + std::string(8, '\xFF')), cut},
      {"array of 2^63 elements", single("\xAF\x13\x80\0\0\0\0\0\0\0\0"s), cutContainer},
      {"dictionary of 2^63 entries", single("\xDF\x13\x80\0\0\0\0\0\0\0\0"s), cutContainer},
      {"dictionary without the values", single("\xD1\0"s), cutContainer},
      {"missing count", single("\x5F"), count},
      {"cut count", single("\x5F\x11\x01"), count},
      {"count that is no integer", single("\x5F\x22\0\0\0\0"s), count},
      {"count of 16 bytes", single("\x5F\x14" + std::string(16, '\0')), count},
  });
}

TEST(BinaryPropertyListReaderTest, RefusesMalformedBinaryFrames) {
  const std::string list = single("\x09");
  const std::string trailer = "a binary property list with a malformed trailer";
  const std::string cut = "a cut binary property list";
  const std::string version = "a binary property list of an unknown version";
  const std::string zero(8, '\0');
  const std::string huge(8, '\xFF');
  ASSERT_EQ(readOutcome(list), "true");
  expectOutcomes({
      {"the mark alone", "bplist", version},
      {"another version", "bplist15" + list.substr(8), version},
      {"the header alone", "bplist00", cut},
      {"header and trailer overlap", "bplist00" + std::string(31, '\0'), cut},
      {"trailer of zeros", "bplist00" + std::string(32, '\0'), trailer},
      {"offsets of no bytes", withTrailerField(list, 26, "\0"s), trailer},
      {"offsets of 9 bytes", withTrailerField(list, 26, "\x09"), trailer},
      {"offsets of 255 bytes", withTrailerField(list, 26, "\xFF"), trailer},
      {"references of no bytes", withTrailerField(list, 25, "\0"s), trailer},
      {"references of 255 bytes", withTrailerField(list, 25, "\xFF"), trailer},
      {"no objects", withTrailerField(list, 24, zero), "object 0: an object that does not exist"},
      {"too many objects", withTrailerField(list, 24, bigEndian(2, 8)), trailer},
      {"2^62 objects", withTrailerField(list, 24, bigEndian(std::uint64_t{1} << 62, 8)), trailer},
      {"2^64-1 objects", withTrailerField(list, 24, huge), trailer},
      {"root that does not exist", withTrailerField(list, 16, bigEndian(1, 8)),
       "object 1: an object that does not exist"},
      {"root of 2^64-1", withTrailerField(list, 16, huge),
       "object 18446744073709551615: an object that does not exist"},
      {"table in the header", withTrailerField(list, 8, bigEndian(7, 8)), trailer},
      {"table in the trailer", withTrailerField(list, 8, bigEndian(14, 8)), trailer},
      {"table at 2^64-1", withTrailerField(list, 8, huge), trailer},
      {"object in the header", std::string(list).replace(9, 4, bigEndian(7, 4)),
       "object 0: an object that lies outside of the objects"},
      {"object in the table", std::string(list).replace(9, 4, bigEndian(9, 4)),
       "object 0: an object that lies outside of the objects"},
      {"object at 2^32-1", std::string(list).replace(9, 4, huge.substr(0, 4)),
       "object 0: an object that lies outside of the objects"},
  });
}

TEST(BinaryPropertyListReaderTest, RefusesBinaryContainersWithBadReferences) {
  BinaryPropertyList stray;
  EXPECT_EQ(readOutcome(stray.bytes(stray.addArray({7}))),
            "object 7: an object that does not exist");

  BinaryPropertyList numberAsKey;
  const auto number = numberAsKey.addBytes("\x10\x01");
  EXPECT_EQ(readOutcome(numberAsKey.bytes(numberAsKey.addDictionary({number}, {number}))),
            "object 0: a key that is no text");

  BinaryPropertyList self;
  EXPECT_EQ(readOutcome(self.bytes(self.addArray({0}))),
            "object 0: an array or dictionary that contains itself");

  BinaryPropertyList selfByValue;
  const auto key = selfByValue.addText("a");
  EXPECT_EQ(readOutcome(selfByValue.bytes(selfByValue.addDictionary({key}, {1}))),
            "object 1: an array or dictionary that contains itself");

  BinaryPropertyList cycle;
  cycle.addArray({1});
  cycle.addArray({2});
  cycle.addArray({0});
  EXPECT_EQ(readOutcome(cycle.bytes(1)), "object 1: an array or dictionary that contains itself");
}

std::string nestedBinaryArrays(std::size_t depth) {
  BinaryPropertyList list(4);
  std::uint64_t inner = list.addBytes("\x09");
  for (std::size_t i = 0; i < depth; ++i) inner = list.addArray({inner});
  return list.bytes(inner);
}

TEST(BinaryPropertyListReaderTest, LimitsTheDepthOfBinaryLists) {
  const std::string tooDeep = "arrays and dictionaries nested deeper than 512 levels";
  EXPECT_EQ(readOutcome(nestedBinaryArrays(512)), repeated("[", 512) + "true" + repeated("]", 512));
  EXPECT_EQ(readOutcome(nestedBinaryArrays(513)), "object 1: " + tooDeep);
  EXPECT_EQ(readOutcome(nestedBinaryArrays(200000)), "object 199488: " + tooDeep);
}

TEST(BinaryPropertyListReaderTest, AcceptsSharedContainersInModeration) {
  BinaryPropertyList list;
  const auto pair = list.addArray({list.addBytes("\x08"), list.addBytes("\x09")});
  EXPECT_EQ(readOutcome(list.bytes(list.addArray({pair, pair, pair}))),
            "[[false, true], [false, true], [false, true]]");
}

TEST(BinaryPropertyListReaderTest, RefusesSharedObjectsThatExplode) {
  const std::string tooLarge = "a binary property list whose shared objects make it too large";

  BinaryPropertyList arrays;
  std::uint64_t inner = arrays.addText("ha");
  for (int level = 0; level < 40; ++level) inner = arrays.addArray({inner, inner});
  EXPECT_EQ(readOutcome(arrays.bytes(inner)), tooLarge);

  BinaryPropertyList dictionaries;
  const auto a = dictionaries.addText("a");
  const auto b = dictionaries.addText("b");
  inner = a;
  for (int level = 0; level < 40; ++level) {
    inner = dictionaries.addDictionary({a, b}, {inner, inner});
  }
  EXPECT_EQ(readOutcome(dictionaries.bytes(inner)), tooLarge);

  BinaryPropertyList data(2);
  const std::string block(1 << 16, 'x');
  inner = data.addBytes("\x4F\x12" + bigEndian(block.size(), 4) + block);
  EXPECT_EQ(readOutcome(data.bytes(data.addArray(std::vector<std::uint64_t>(10000, inner)))),
            tooLarge);

  BinaryPropertyList keys(2);
  const auto longKey = keys.addText(block);
  const auto entry = keys.addDictionary({longKey}, {longKey});
  EXPECT_EQ(readOutcome(keys.bytes(keys.addArray(std::vector<std::uint64_t>(10000, entry)))),
            tooLarge);
}

TEST(BinaryPropertyListReaderTest, RefusesOverlappingTextsThatExplode) {
  // Every object is a text that runs over all the following ones.
  constexpr std::size_t kTexts = 20000;
  constexpr std::size_t kSize = 10;
  std::string objects;
  for (std::size_t i = 0; i < kTexts; ++i) {
    objects += "\x5F\x13" + bigEndian((kTexts - 1 - i) * kSize, 8);
  }
  std::string array = "\xAF\x12" + bigEndian(kTexts, 4);
  for (std::size_t i = 0; i < kTexts; ++i) array += bigEndian(i, 4);
  std::string table;
  for (std::size_t i = 0; i <= kTexts; ++i) table += bigEndian(8 + i * kSize, 4);
  const std::string bytes = "bplist00" + objects + array + table + std::string(6, '\0') +
                            "\x04\x04" + bigEndian(kTexts + 1, 8) + bigEndian(kTexts, 8) +
                            bigEndian(8 + objects.size() + array.size(), 8);
  EXPECT_EQ(readOutcome(bytes), "a binary property list whose shared objects make it too large");
}

TEST(BinaryPropertyListReaderTest, RefusesSharedTextsThatWouldBeWrittenTooOften) {
  const auto outcomeOf = [](char character, std::size_t size, std::size_t count) {
    BinaryPropertyList list(2);
    const auto key = list.addText("EpisodeName");
    const auto text = list.addText(std::string(size, character));
    std::vector<std::uint64_t> entries;
    for (std::size_t i = 0; i < count; ++i) entries.push_back(list.addDictionary({key}, {text}));
    return readOutcome(list.bytes(list.addArray(entries))).substr(0, 100);
  };
  const std::string tooLarge = "a binary property list whose shared objects make it too large";
  EXPECT_TRUE(outcomeOf('x', 10'000, 300).starts_with("[{\"EpisodeName\": \"xxx"));
  EXPECT_EQ(outcomeOf('x', 10'000, 400), tooLarge);
  // A feed has "&amp;" for it.
  EXPECT_TRUE(outcomeOf('&', 10'000, 35).starts_with("[{\"EpisodeName\": \"&&&"));
  EXPECT_EQ(outcomeOf('&', 10'000, 45), tooLarge);
}

TEST(BinaryPropertyListReaderTest, CountsWhatTextsBecome) {
  // Overlapping texts of bytes that are no ASCII: each byte becomes the three of U+FFFD.
  const auto outcomeOf = [](std::size_t size, std::size_t count) {
    BinaryPropertyList list(4);
    const std::string head = "\x5F\x12" + bigEndian(size, 4);
    std::vector<std::uint64_t> texts;
    for (std::size_t i = 0; i < count; ++i) texts.push_back(list.addBytes(head));
    list.addBytes(std::string(size, '\xFF'));
    return readOutcome(list.bytes(list.addArray(texts))).substr(0, 100);
  };
  // 1.5 MB of bytes, which would pass, but 4.5 MB of UTF-8, and as much twice in a feed.
  EXPECT_EQ(outcomeOf(10'000, 70).substr(0, 2), "[\"");
  EXPECT_EQ(outcomeOf(10'000, 150),
            "a binary property list whose shared objects make it too large");
}

TEST(BinaryPropertyListReaderTest, RefusesSharedElementsThatWouldBecomeTooManyRecords) {
  for (const std::string& element : {"\x09"s, "\xD0"s, "\x51x"s}) {
    const auto outcomeOf = [&element](std::size_t count) {
      BinaryPropertyList list;
      const std::vector<std::uint64_t> elements(count, list.addBytes(element));
      return readOutcome(list.bytes(list.addArray(elements))).substr(0, 100);
    };
    EXPECT_TRUE(outcomeOf(30'000).starts_with("["));
    EXPECT_EQ(outcomeOf(100'000), "a binary property list whose shared objects make it too large");
  }
}

TEST(BinaryPropertyListReaderTest, AcceptsUnsharedObjectsInAnyNumber) {
  BinaryPropertyList list(4);
  std::vector<std::uint64_t> elements;
  for (int i = 0; i < 300'000; ++i) elements.push_back(list.addBytes("\xD0"));
  EXPECT_TRUE(readOutcome(list.bytes(list.addArray(elements))).starts_with("[{}, {}"));
}

std::string smallBinaryList() {
  BinaryPropertyList list;
  const auto name = list.addText("Name");
  const auto text = list.addBytes("\x62\x00\xE9\x20\xAC"s);
  const auto number = list.addBytes("\x11\x01\x02");
  const auto real = list.addBytes("\x23\x3F\xF8\0\0\0\0\0\0"s);
  const auto date = list.addBytes("\x33\x41\xB0\0\0\0\0\0\0"s);
  const auto data = list.addBytes("\x4F\x10\x02\x01\x02");
  const auto yes = list.addBytes("\x09");
  const auto array = list.addArray({text, number, real, date, data, yes});
  return list.bytes(list.addDictionary({name}, {array}));
}

TEST(BinaryPropertyListReaderTest, RefusesBinaryListsCutAnywhere) {
  const std::string whole = smallBinaryList();
  ASSERT_EQ(readOutcome(whole),
            "{\"Name\": [\"\xC3\xA9\xE2\x82\xAC\", 258, 1.5r, "
            "2009-07-04T21:24:16.000, <0102>, true]}");
  for (std::size_t length = 0; length < whole.size(); ++length) {
    std::optional<PropertyListFault> fault;
    EXPECT_FALSE(readPropertyList(whole.substr(0, length), fault)) << length;
    EXPECT_TRUE(fault) << length;
  }
}

TEST(BinaryPropertyListReaderTest, SurvivesBinaryListsWithAnyByteChanged) {
  const std::string whole = smallBinaryList();
  for (std::size_t i = 0; i < whole.size(); ++i) {
    for (int byte = 0; byte < 256; ++byte) {
      std::string changed = whole;
      changed[i] = static_cast<char>(byte);
      readOutcome(changed);  // expects either a value or an error
    }
  }
}

}  // namespace
}  // namespace platform
