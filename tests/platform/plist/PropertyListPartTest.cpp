#include "platform/plist/PropertyListPart.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <vector>

#include "tests/support/BinaryPropertyList.h"

namespace platform {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

/// A list that was read with its places.
struct List {
  explicit List(std::string document) {
    std::optional<PropertyListFault> fault;
    value = readPropertyList(std::move(document), fault, &places);
  }
  PropertyListPart root() const { return {.value = &*value, .places = &places}; }

  PropertyListPlaces places;
  std::optional<PropertyListValue> value;
};

/// "PATH KEY KIND KEYPOSITION POSITION" of each part.
std::vector<std::string> shown(const std::vector<PropertyListPart>& parts) {
  const auto place = [](const std::optional<TextPosition>& position) {
    return position ? position->text() : std::string("nowhere");
  };
  std::vector<std::string> lines;
  for (const PropertyListPart& part : parts) {
    lines.push_back(std::string(part.path)
                        .append("|")
                        .append(part.key)
                        .append("|")
                        .append(part.kind())
                        .append("|")
                        .append(place(part.keyPosition()))
                        .append("|")
                        .append(place(part.position())));
  }
  return lines;
}

TEST(PropertyListPartTest, PartsStandAsTheDocumentHasThem) {
  const List list(
      "<plist><dict><key>b</key>\n<string>x</string><key>a</key><array>\n<real>1</real>"
      "<false/></array>\n<key>b</key><integer>1</integer></dict></plist>");
  const std::vector<PropertyListPart> parts = list.root().parts();
  EXPECT_THAT(shown(parts), ElementsAre("|b|an integer|line 1, column 14|line 2, column 1",
                                        "|a|an array|line 2, column 19|line 2, column 31",
                                        "|b|an integer|line 4, column 1|line 4, column 13"));
  EXPECT_THAT(shown(parts.at(1).parts()),
              ElementsAre("||a number with a fraction|line 3, column 1|line 3, column 1",
                          "||a truth value|line 3, column 15|line 3, column 15"));
  EXPECT_THAT(shown(parts.at(2).parts()), ElementsAre());
}

TEST(PropertyListPartTest, PartsOfABinaryListHavePaths) {
  BinaryPropertyList list;
  const auto text = list.addText("x");
  const auto inner = list.addArray({text, text});
  const auto key = list.addText("k");
  const auto outer = list.addDictionary({key}, {inner});
  const List read(list.bytes(list.addArray({outer})));
  ASSERT_TRUE(read.value);
  const std::vector<PropertyListPart> parts = read.root().parts();
  EXPECT_THAT(shown(parts), ElementsAre("[1]||a dictionary|nowhere|nowhere"));
  const std::vector<PropertyListPart> entries = parts.at(0).parts();
  EXPECT_THAT(shown(entries), ElementsAre("[1].k|k|an array|nowhere|nowhere"));
  EXPECT_THAT(shown(entries.at(0).parts()),
              ElementsAre("[1].k[1]||a text|nowhere|nowhere", "[1].k[2]||a text|nowhere|nowhere"));
  EXPECT_EQ(entries.at(0).parts().at(0).text(), "x");
  EXPECT_THAT(entries.at(0).parts().at(0).parts(), IsEmpty());
}

TEST(PropertyListPartTest, EveryKindHasItsName) {
  const List list(
      "<plist><array><string/><integer>1</integer><integer>18446744073709551615</integer>"
      "<real>1</real><true/><date>2026-04-04T04:30:00Z</date><data/><array/><dict/></array>"
      "</plist>");
  std::vector<std::string> kinds;
  for (const PropertyListPart& part : list.root().parts()) kinds.emplace_back(part.kind());
  EXPECT_THAT(kinds, ElementsAre("a text", "an integer", "an integer", "a number with a fraction",
                                 "a truth value", "a date", "data", "an array", "a dictionary"));
}

}  // namespace
}  // namespace platform
