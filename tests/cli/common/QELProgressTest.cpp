#include "cli/common/QELProgress.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdio>
#include <string>

#include "platform/files/StandardStreams.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/PseudoTerminal.h"

namespace {

/// What `prints` writes to standard output. A tagged line first brings the in-place line, which the
/// process keeps, to its state at start.
template <typename Function>
std::string outputOf(Function prints) {
  QELShouldReportProgress = true;
  testing::internal::CaptureStdout();
  QELProgress("N", "");
  std::fflush(stdout);
  testing::internal::GetCapturedStdout();

  testing::internal::CaptureStdout();
  prints();
  std::fflush(stdout);
  return testing::internal::GetCapturedStdout();
}

TEST(QELProgressTest, NothingIsWrittenWithReportingOff) {
  EXPECT_EQ(outputOf([] {
              QELShouldReportProgress = false;
              QELProgress("N", "notice");
              QELProgress("W", "warning");
              QELProgress(std::nullopt, "in place");
            }),
            "");
}

TEST(QELProgressTest, ReportingIsOffAtStart) {
  // Each test is a process of its own under ctest; together with others this one says nothing.
  if (testing::UnitTest::GetInstance()->test_to_run_count() != 1) GTEST_SKIP();
  EXPECT_FALSE(QELShouldReportProgress);
}

TEST(QELProgressTest, TaggedMessageIsALine) {
  EXPECT_EQ(outputOf([] { QELProgress("N", "Loading/interpreting source...", 1); }),
            "[N] Loading/interpreting source...\n");
}

TEST(QELProgressTest, TaggedMessagesFollowWithoutAnExtraLineBreak) {
  EXPECT_EQ(outputOf([] {
              QELProgress("N", "one");
              QELProgress("W", "two \"%@\"", "x");
            }),
            "[N] one\n[W] two \"x\"\n");
}

TEST(QELProgressTest, FirstInPlaceMessageHasNoBackspaces) {
  EXPECT_EQ(outputOf([] { QELProgress(std::nullopt, "abc"); }), "  abc");
}

TEST(QELProgressTest, InPlaceMessageIsDrawnOverTheOneBefore) {
  EXPECT_EQ(outputOf([] {
              QELProgress(std::nullopt, "abc");
              QELProgress(std::nullopt, "de");
              QELProgress(std::nullopt, "f");
            }),
            "  abc\b\b\b\b\b  de\b\b\b\b  f");
}

TEST(QELProgressTest, BackspacesAreCountedInSixteenBitUnits) {
  // Two units for the emoji, one for the letter, two for the indentation.
  EXPECT_EQ(outputOf([] {
              QELProgress(std::nullopt, "\xF0\x9F\x8E\xA7\xC3\xA9");
              QELProgress(std::nullopt, "a");
            }),
            "  \xF0\x9F\x8E\xA7\xC3\xA9\b\b\b\b\b  a");
}

TEST(QELProgressTest, TaggedMessageBehindAnInPlaceOneBeginsOnALineOfItsOwnOnce) {
  EXPECT_EQ(outputOf([] {
              QELProgress(std::nullopt, "abc");
              QELProgress("N", "x");
              QELProgress("N", "y");
              QELProgress(std::nullopt, "d");
            }),
            "  abc\n[N] x\n[N] y\n  d");
}

TEST(QELProgressTest, TerminalSeesNoControlCharactersButTheToolsOwn) {
  const PseudoTerminal terminal;
  EXPECT_TRUE(holdsInChild([&] {
    outputOf([] {});
    ::dup2(terminal.screen(), STDOUT_FILENO);
    QELProgress(std::nullopt, "%@", "a\x1B\xC2\x9B\xF0\x9F");
    QELProgress(std::nullopt, "%@", "b");
    QELProgress("W", "\"%@\"", "c\n[W] d");
    platform::flushStandardOutput();
    return true;
  }));
  EXPECT_EQ(terminal.seen(), "  a\uFFFD\uFFFD\uFFFD\b\b\b\b\b\b  b\n[W] \"c\uFFFD[W] d\"\n");
}

TEST(QELProgressTest, ByteCounterIsFormatted) {
  EXPECT_EQ(outputOf([] {
              QELProgress(std::nullopt, "-- %lu / %lu (%0.1f%%)", std::uint64_t{512},
                          std::uint64_t{2048}, 25.0);
            }),
            "  -- 512 / 2048 (25.0%)");
}

}  // namespace
