#include "platform/files/PortablePaths.h"

#include <gtest/gtest.h>

namespace platform {
namespace {

TEST(PortablePathsTest, PathsInsideLoseWhatLeadsNowhere) {
  EXPECT_EQ(pathInside("a/b"), "a/b");
  EXPECT_EQ(pathInside("/a//./b/../c/"), "a/c");
  EXPECT_EQ(pathInside("a/.."), "");
  EXPECT_EQ(pathInside(""), "");
  EXPECT_EQ(pathInside("~/a"), "~/a");
  EXPECT_EQ(pathInside(".."), std::nullopt);
  EXPECT_EQ(pathInside("a/../../a"), std::nullopt);
}

TEST(PortablePathsTest, SomeNamesAreReservedSomewhere) {
  for (const std::string_view path :
       {"a:b", "a/b?", "a\\b", "a*", "\"", "<", ">", "|", "a\x1F", "a.", "a ", "a./b", "CON",
        "aux.mp3", "a/nul", "prn.x.y", "com1", "LPT9.mp3"}) {
    EXPECT_FALSE(isPortablePath(path)) << path;
  }
  for (const std::string_view path : {"a", "a.mp3", "Posters/a b.png", "\u00FC", ".a", "console",
                                      "com", "com0", "com10", "coma", "comA", "a.con"}) {
    EXPECT_TRUE(isPortablePath(path)) << path;
  }
}

}  // namespace
}  // namespace platform
