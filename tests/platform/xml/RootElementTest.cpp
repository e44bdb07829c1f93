#include "platform/xml/RootElement.h"

#include <gtest/gtest.h>

#include <string>

namespace platform {
namespace {

TEST(RootElementTest, IsTheFirstElement) {
  EXPECT_EQ(rootElementName("<?xml version=\"1.0\"?>\n<!-- <a> --><rss><channel/></rss>"), "rss");
  EXPECT_EQ(rootElementName("<x:rss>cut"), "x:rss");
  EXPECT_EQ(rootElementName(std::string("\xFF\xFE<\0p\0l\0i\0s\0t\0>\0", 16)), "plist");
  for (const char* const head : {"", "text", "<rss", "<!-- <rss>", "bplist00"}) {
    EXPECT_EQ(rootElementName(head), std::nullopt) << head;
  }
}

}  // namespace
}  // namespace platform
