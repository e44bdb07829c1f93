#include "platform/plist/PropertyListReader.h"

#include <gtest/gtest.h>

#include <optional>
#include <string>

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

}  // namespace
}  // namespace platform
