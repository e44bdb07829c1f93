#include "platform/process/CommandOptions.h"

#include <gtest/gtest.h>

#include <array>
#include <string>
#include <vector>

namespace {

using platform::parseCommandWords;

std::string parsed(const std::vector<const char*>& arguments) {
  const std::array<platform::CommandOption, 4> options = {
      {{"jobs", 'j', true}, {"quiet", 'q', false}, {"quick", '\0', false}, {"link", '\0', true}}};
  const platform::CommandWords words = parseCommandWords(arguments, options);
  if (words.fault) return *words.fault;
  std::string text;
  for (const auto& [index, value] : words.options) {
    text += options.at(index).name + "=" + value + " ";
  }
  for (const std::string& operand : words.operands) text += "[" + operand + "]";
  return text;
}

TEST(CommandOptionsTest, WordsAreTakenAsTheGNULibraryDoes) {
  EXPECT_EQ("", parsed({}));
  EXPECT_EQ("jobs=4 [a][b]", parsed({"a", "--jobs", "4", "b"}));
  EXPECT_EQ("jobs=4 ", parsed({"--jobs=4"}));
  EXPECT_EQ("jobs=4 ", parsed({"-j4"}));
  EXPECT_EQ("quiet= jobs=-q ", parsed({"-qj", "-q"}));
  EXPECT_EQ("jobs= ", parsed({"--jobs="}));
  EXPECT_EQ("jobs=4 ", parsed({"--j", "4"}));
  EXPECT_EQ("quiet= quiet= ", parsed({"-qq"}));
  EXPECT_EQ("quiet= [-][--quick]", parsed({"-", "-q", "--", "--quick"}));
}

TEST(CommandOptionsTest, AFaultLeavesNothingForTheNextLine) {
  EXPECT_EQ("unrecognized option '-x'", parsed({"-xqj"}));
  EXPECT_EQ("jobs=4 ", parsed({"-j", "4"}));
}

TEST(CommandOptionsTest, EachFaultIsNamed) {
  EXPECT_EQ("unrecognized option '--nope'", parsed({"a", "--nope=3", "-q"}));
  EXPECT_EQ("unrecognized option '-x'", parsed({"-qx"}));
  EXPECT_EQ("ambiguous option '--qui'", parsed({"--qui"}));
  EXPECT_EQ("option '--jobs' requires a value", parsed({"a", "--jobs"}));
  EXPECT_EQ("option '-j' requires a value", parsed({"-q", "-j"}));
  EXPECT_EQ("option '--quiet' takes no value", parsed({"--quiet=yes"}));
}

}  // namespace
