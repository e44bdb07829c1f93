#include "platform/plist/PropertyListReader.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "tests/support/BinaryPropertyList.h"
#include "tests/support/PropertyListDump.h"

namespace platform {
namespace {

using namespace std::string_literals;

TEST(PropertyListReaderTest, TheFirstBytesTellTheForm) {
  BinaryPropertyList list;
  expectOutcomes({
      {"XML", "<plist><true/></plist>", "true"},
      {"binary", list.bytes(list.addBytes("\x09")), "true"},
      {"empty", "", "an empty property list"},
      {"the mark alone", "bplist", "a binary property list of an unknown version"},
      {"half of the mark", "bpl", "syntax error at line 1, column 1"},
      {"the mark behind white space", " bplist00", "syntax error at line 1, column 2"},
  });
}

TEST(PropertyListReaderTest, AFaultHoldsItsPlaceApart) {
  std::optional<PropertyListFault> fault;
  EXPECT_FALSE(readPropertyList("<plist>\n<dict>\n  <true/></dict></plist>"s, fault));
  EXPECT_EQ(fault->description, "a value without a key in a dictionary");
  EXPECT_EQ(fault->position, (TextPosition{.line = 3, .column = 3}));
  EXPECT_EQ(fault->object, std::nullopt);

  BinaryPropertyList list;
  EXPECT_FALSE(readPropertyList(list.bytes(list.addArray({7})), fault));
  EXPECT_EQ(fault->description, "an object that does not exist");
  EXPECT_EQ(fault->position, std::nullopt);
  EXPECT_EQ(fault->object, 7U);
}

/// "KEY LINE:COLUMN LINE:COLUMN END" of each place.
std::vector<std::string> placesOf(const std::string& document,
                                  std::optional<PropertyListFault>* fault = nullptr) {
  std::optional<PropertyListFault> ignored;
  PropertyListPlaces places;
  readPropertyList(document, fault != nullptr ? *fault : ignored, &places);
  const auto shown = [](const TextPosition& position) {
    return std::to_string(position.line).append(":").append(std::to_string(position.column));
  };
  std::vector<std::string> lines;
  for (const PropertyListPlace& place : places) {
    lines.push_back(place.key.string()
                        .append(" ")
                        .append(shown(place.keyPosition))
                        .append(" ")
                        .append(shown(place.position))
                        .append(" ")
                        .append(std::to_string(place.end)));
  }
  return lines;
}

TEST(PropertyListReaderTest, TellsWhereEverythingStands) {
  using testing::ElementsAre;
  EXPECT_THAT(placesOf("<plist><dict>\n"
                       "  <key>b</key><string>\xC3\xA9</string><key>a</key>\n"
                       "  <array><true/><dict><key>c</key><integer>1</integer></dict>\n"
                       "  </array><key>b</key><date>2026-04-04T04:30:00Z</date>\n"
                       "</dict></plist>"),
              ElementsAre(" 1:8 1:8 7", "b 2:3 2:15 2", "a 2:33 3:3 6", " 3:10 3:10 4",
                          " 3:17 3:17 6", "c 3:23 3:35 6", "b 4:11 4:23 7"));
  EXPECT_THAT(placesOf("\n\n  <plist><true/></plist>"), ElementsAre(" 3:10 3:10 1"));
  EXPECT_THAT(placesOf("\xEF\xBB\xBF<plist><true/></plist>"), ElementsAre(" 1:8 1:8 1"));
  BinaryPropertyList list;
  EXPECT_THAT(placesOf(list.bytes(list.addBytes("\x09"))), ElementsAre());
}

TEST(PropertyListReaderTest, ABinaryListThatCannotBeReadToItsEndTellsTheCause) {
  bool isFirst = true;
  ByteSource document(100'000, [&isFirst](std::span<char> room, ErrorSlot& error) {
    std::optional<std::size_t> count;
    if (std::exchange(isFirst, false)) {
      std::fill(room.begin(), room.end(), '\0');
      std::string_view("bplist00").copy(room.data(), room.size());
      count = room.size();
    } else {
      error = ErrorRecord{"POSIX", 5, "Input/output error"};
    }
    return count;
  });
  std::optional<PropertyListFault> fault;
  EXPECT_FALSE(readPropertyList(std::move(document), fault));
  ASSERT_TRUE(fault);
  EXPECT_EQ(fault->description, "Input/output error");
}

TEST(PropertyListReaderTest, WithPlacesAFaultyValueStandsAtItsBeginning) {
  const std::string document = "<plist>\n <integer>\n one\n</integer></plist>";
  std::optional<PropertyListFault> fault;
  EXPECT_FALSE(readPropertyList(document, fault));
  EXPECT_EQ(fault->position, (TextPosition{.line = 4, .column = 1}));
  placesOf(document, &fault);
  EXPECT_EQ(fault->position, (TextPosition{.line = 2, .column = 2}));
  placesOf("<plist><dict>\n<true/></dict></plist>", &fault);
  EXPECT_EQ(fault->position, (TextPosition{.line = 2, .column = 1}));
}

}  // namespace
}  // namespace platform
