#include "generators/QELBundleNames.h"

#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <string_view>

namespace {

using platform::Text;

TEST(QELBundleNamesTest, TakesTheLastComponentOfALocation) {
  const struct {
    std::string_view location;
    platform::OptionalText referenceType;
    std::optional<std::string> name;
  } rows[] = {
      {"/media/ebb.mp3", Text("local"), "ebb.mp3"},
      {"/media/ebb.mp3/", Text("local"), "ebb.mp3"},
      {"/media/ebb%20.mp3?x", Text("local"), "ebb%20.mp3?x"},
      {"/media/..", std::nullopt, ".."},
      {"", std::nullopt, ""},
      {"http://h/media/ebb%20.mp3?x#y", Text("remote"), "ebb .mp3"},
      {"http://h/a%2Fb.mp3", Text("remote"), "a/b.mp3"},
      {"http://h", Text("remote"), ""},
      {"http://h/a b", Text("remote"), std::nullopt},
      {"/media/ebb.mp3", Text("remote"), std::nullopt},
      {"http://h/a%2Fb", Text("other"), "a%2Fb"},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(QELFileName({Text(row.location), row.referenceType}), row.name) << row.location;
  }
  EXPECT_EQ(QELFileName({std::nullopt, Text("local")}), std::nullopt);
}

TEST(QELBundleNamesTest, BaseNamesHoldNeitherExtensionNorSlash) {
  EXPECT_EQ(QELBaseName("ebb.tide.mp3"), "ebb.tide");
  EXPECT_EQ(QELBaseName("a:b/c.mp3"), "ab:c");
  EXPECT_EQ(QELBaseName(":::.mp3"), "");
  EXPECT_EQ(QELBaseName(".profile"), ".profile");
  EXPECT_EQ(QELNameWithExtension("ebb", "mp3"), "ebb.mp3");
  EXPECT_EQ(QELNameWithExtension("ebb", ""), "ebb.");
}

TEST(QELBundleNamesTest, TellsTheNamesThatFilesCanHave) {
  EXPECT_TRUE(QELIsSaneName("ebb.mp3"));
  EXPECT_TRUE(QELIsSaneName(std::string(255, 'n')));
  EXPECT_TRUE(QELIsSaneName("..."));
  for (const std::string& name :
       {std::string(), std::string("."), std::string(".."), std::string("a/b"),
        std::string("a\0b", 3), std::string("a\x01"), std::string("\xFF"), std::string(256, 'n')}) {
    EXPECT_FALSE(QELIsSaneName(name)) << testing::PrintToString(name);
  }
  EXPECT_TRUE(QELNamesFile("..."));
  for (const std::string_view name : {"", ".", ".."}) EXPECT_FALSE(QELNamesFile(name)) << name;
}

}  // namespace
