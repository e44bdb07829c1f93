#include "platform/text/Text.h"

#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <utility>

namespace platform {
namespace {

using namespace std::string_literals;

TEST(TextTest, HoldsACopyOfTheCharacters) {
  std::string characters = "a\0b"s;
  const Text text(characters);
  characters[0] = 'x';
  EXPECT_EQ(text, "a\0b"s);
  EXPECT_EQ(text.string(), "a\0b"s);
  EXPECT_EQ(text.size(), 3U);
  EXPECT_FALSE(text.empty());
}

TEST(TextTest, EmptyText) {
  for (const Text& text : {Text(), Text(""), Text(std::string()), ""_text}) {
    EXPECT_TRUE(text.empty());
    EXPECT_EQ(text, "");
    EXPECT_EQ(text, Text());
  }
}

TEST(TextTest, CopiesShareTheCharactersAndOutliveTheirSource) {
  platform::OptionalText first("some characters");
  const Text copy = *first;
  EXPECT_EQ(copy.view().data(), first->view().data());
  first.reset();
  EXPECT_EQ(copy, "some characters");
}

TEST(TextTest, EqualityIsThatOfTheCharacters) {
  EXPECT_EQ(Text("a"), Text(std::string("a")));
  EXPECT_NE(Text("a"), Text("b"));
  EXPECT_NE(Text("a"), "a\0"s);
}

TEST(TextTest, LiteralIsNotCopied) {
  const Text text = "lit\0eral"_text;
  EXPECT_EQ(text, "lit\0eral"s);
  const Text copy = text;
  EXPECT_EQ(copy.view().data(), text.view().data());
}

TEST(TextTest, MovingLeavesTheEmptyTextBehind) {
  Text first("words");
  Text second(std::move(first));
  EXPECT_EQ(second, "words");
  EXPECT_EQ(first, "");  // NOLINT(bugprone-use-after-move): the matter of this test
  first = std::move(second);
  EXPECT_EQ(first, "words");
  EXPECT_EQ(second.size(), 0U);  // NOLINT(bugprone-use-after-move): the same
}

}  // namespace
}  // namespace platform
