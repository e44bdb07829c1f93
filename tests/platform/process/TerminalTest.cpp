#include "platform/process/Terminal.h"

#include <gtest/gtest.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <cstddef>
#include <optional>

#include "tests/support/ChildProcess.h"
#include "tests/support/EnvironmentGuard.h"
#include "tests/support/PseudoTerminal.h"

namespace {

TEST(TerminalTest, APipeIsNone) {
  testing::internal::CaptureStdout();
  setenv("TERM", "xterm", 1);
  EXPECT_EQ(platform::terminalColumns(), std::nullopt);
  testing::internal::GetCapturedStdout();
}

/// The columns that are told where standard output is a terminal of that width and kind.
std::optional<std::size_t> columnsOf(unsigned short width, const char* kind) {
  constexpr int kNone = 200;
  const EnvironmentGuard term("TERM", kind);
  const int status = exitStatusOfChild([&] {
    const PseudoTerminal terminal;
    const winsize size{.ws_row = 24, .ws_col = width, .ws_xpixel = 0, .ws_ypixel = 0};
    ::ioctl(terminal.screen(), TIOCSWINSZ, &size);
    ::dup2(terminal.screen(), STDOUT_FILENO);
    return static_cast<int>(platform::terminalColumns().value_or(kNone));
  });
  return status == kNone ? std::nullopt : std::optional<std::size_t>(status);
}

TEST(TerminalTest, ATerminalTellsItsWidth) {
  EXPECT_EQ(columnsOf(132, "xterm"), 132U);
  EXPECT_EQ(columnsOf(1, "xterm"), 1U);
  EXPECT_EQ(columnsOf(0, "xterm"), 80U);
}

TEST(TerminalTest, ATerminalThatUnderstandsNothingIsNone) {
  for (const char* kind : {"dumb", "", static_cast<const char*>(nullptr)}) {
    EXPECT_EQ(columnsOf(132, kind), std::nullopt);
  }
  EXPECT_EQ(columnsOf(132, "dumber"), 132U);
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
  EXPECT_EQ(platform::textOfWidth("ＡＢ", 3), "Ａ ");  // of full width
  EXPECT_EQ(platform::textOfWidth("ｱｲ", 3), "ｱｲ ");    // of half width
  EXPECT_EQ(platform::textOfWidth("e\u0301f", 2), "e\u0301f");
  EXPECT_EQ(platform::textOfWidth("e\u0301f", 1), "e\u0301");
  EXPECT_EQ(platform::textOfWidth("a\tb", 3), "a\uFFFDb");
}

}  // namespace
