#include "platform/xml/TextPosition.h"

#include <gtest/gtest.h>

#include <string_view>

namespace platform {
namespace {

TEST(TextPositionTest, CountsLinesAndCharacters) {
  const struct {
    std::string_view text;
    std::string_view position;
  } rows[] = {
      {"", "line 1, column 1"},       {"abc", "line 1, column 4"},
      {"é日😀", "line 1, column 4"},   {"a\n", "line 2, column 1"},
      {"a\r", "line 2, column 1"},    {"a\r\n", "line 2, column 1"},
      {"\n\nb", "line 3, column 2"},  {"\r\r\n\n", "line 4, column 1"},
      {"a\n\rb", "line 3, column 2"}, {"\t\t", "line 1, column 3"},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(positionBehind(row.text).text(), row.position) << testing::PrintToString(row.text);
  }
}

}  // namespace
}  // namespace platform
