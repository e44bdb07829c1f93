#include "platform/process/SystemStart.h"

#include <gtest/gtest.h>

namespace platform {
namespace {

TEST(SystemStartTest, IsTheSameLineAsLongAsTheSystemRuns) {
  const std::string start = systemStart();
#ifdef __linux__
  EXPECT_EQ(start.size(), 36U);  // a uuid
#endif
  EXPECT_EQ(start.find('\n'), std::string::npos);
  EXPECT_EQ(start, systemStart());
}

}  // namespace
}  // namespace platform
