#include "cli/common/QELReferenceType.h"

#include <gtest/gtest.h>

namespace {

TEST(QELReferenceTypeTest, ClassesLocations) {
  const struct {
    std::optional<std::string_view> location;
    platform::OptionalText type;
  } rows[] = {
      {std::nullopt, std::nullopt},
      {"", std::nullopt},
      {"http://a.example/1.mp3", "remote"},
      {"Https://a.example/1.mp3", "remote"},
      {"HTTP", "remote"},
      {"httpfoo", "remote"},
      {"file:///tmp/a.mp3", "remote"},
      {"FILE:/tmp/a.mp3", "remote"},
      {"fIlE:", "remote"},
      {"file", "local"},
      {"htt", "local"},
      {"pcast://a.example/feed", "local"},
      {"/tmp/a.mp3", "local"},
      {"a.mp3", "local"},
      {" http://a.example/", "local"},
      {"\xE2\x84\xAA", "local"},  // one character that takes three bytes
  };
  for (const auto& row : rows) {
    EXPECT_EQ(QELReferenceType(row.location), row.type) << row.location.value_or("(absent)");
  }
}

TEST(QELReferenceTypeTest, NoMediaTypeIsDerived) {
  EXPECT_EQ(QELMIMEType(std::nullopt), std::nullopt);
  EXPECT_EQ(QELMIMEType("a.mp3"), std::nullopt);
  EXPECT_EQ(QELMIMEType(""), std::nullopt);
}

}  // namespace
