#include "platform/process/Terminal.h"

#include <gtest/gtest.h>

namespace {

TEST(TerminalTest, APipeIsNone) {
  testing::internal::CaptureStdout();
  setenv("TERM", "xterm", 1);
  EXPECT_EQ(platform::terminalColumns(), std::nullopt);
  testing::internal::GetCapturedStdout();
}

TEST(TerminalTest, NoTextSteersATerminal) {
  EXPECT_EQ(platform::harmlessText("a\x1B[2Jb\nc\x7F"), "a\uFFFD[2Jb\uFFFDc\uFFFD");
  EXPECT_EQ(platform::harmlessText("a\u009Bb\u00A0ä"), "a\uFFFDb\u00A0ä");
  EXPECT_EQ(platform::harmlessText("a\xFF"), "a\uFFFD");
}

TEST(TerminalTest, TextsAreCutAndFilledUpToAWidth) {
  EXPECT_EQ(platform::textOfWidth("abc", 5), "abc  ");
  EXPECT_EQ(platform::textOfWidth("abc", 3), "abc");
  EXPECT_EQ(platform::textOfWidth("abc", 2), "ab");
  EXPECT_EQ(platform::textOfWidth("abc", 0), "");
  EXPECT_EQ(platform::textOfWidth("日本", 3), "日 ");
  EXPECT_EQ(platform::textOfWidth("日本", 4), "日本");
  EXPECT_EQ(platform::textOfWidth("e\u0301f", 2), "e\u0301f");
  EXPECT_EQ(platform::textOfWidth("e\u0301f", 1), "e\u0301");
  EXPECT_EQ(platform::textOfWidth("a\tb", 3), "a\uFFFDb");
}

}  // namespace
