#include "platform/process/Process.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <functional>
#include <new>
#include <string>
#include <thread>
#include <vector>

#include "platform/files/StandardStreams.h"
#include "platform/files/TemporaryFile.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/RefusedSystemCall.h"
#include "tests/support/TemporaryDirectory.h"

namespace platform {
namespace {

TEST(ProcessTest, ClosedPipeIsAFailedWrite) {
  EXPECT_TRUE(holdsInChild([] {
    ::signal(SIGPIPE, SIG_DFL);
    prepareProcess();
    std::array<int, 2> ends{};
    return ::pipe(ends.data()) == 0 && ::close(ends[0]) == 0 && ::write(ends[1], "x", 1) == -1 &&
           errno == EPIPE;
  }));
}

TEST(ProcessTest, FileBeyondTheLimitIsAFailedWrite) {
  const TemporaryDirectory directory;
  const std::string path = directory.addFile("file", "");
  EXPECT_TRUE(holdsInChild([&] {
    ::signal(SIGXFSZ, SIG_DFL);
    prepareProcess();
    const rlimit limit{0, 0};
    ::setrlimit(RLIMIT_FSIZE, &limit);
    return ::write(::open(path.c_str(), O_WRONLY), "x", 1) == -1 && errno == EFBIG;
  }));
}

bool isOpenOnNothing(int descriptor) {
  struct stat nothing {};
  struct stat open {};
  return ::stat("/dev/null", &nothing) == 0 && ::fstat(descriptor, &open) == 0 &&
         open.st_rdev == nothing.st_rdev && S_ISCHR(open.st_mode);
}

TEST(ProcessTest, ClosedStandardStreamsAreOpenedOnNothing) {
  const TemporaryDirectory directory;
  const std::string path = directory.addFile("file", "content");
  for (unsigned closed = 0; closed < 8; ++closed) {
    SCOPED_TRACE(closed);
    EXPECT_EQ(exitStatusOfChild([&] {
                const int file = ::open(path.c_str(), O_RDWR);
                for (int descriptor = 0; descriptor < 3; ++descriptor) {
                  ::dup2(file, descriptor);
                  if ((closed >> static_cast<unsigned>(descriptor) & 1U) != 0) ::close(descriptor);
                }
                ::close(file);
                prepareProcess();
                for (int descriptor = 0; descriptor < 3; ++descriptor) {
                  const bool wasClosed = (closed >> static_cast<unsigned>(descriptor) & 1U) != 0;
                  if (isOpenOnNothing(descriptor) != wasClosed) return 1;
                }
                return ::open(path.c_str(), O_RDONLY) > 2 ? 0 : 2;
              }),
              0);
  }
}

TEST(ProcessTest, EndsWhereAClosedStreamCannotBeOpened) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  for (const int closed : {STDIN_FILENO, STDOUT_FILENO}) {
    testing::internal::CaptureStderr();
    EXPECT_EQ(exitStatusOfChild([&] {
                ::close(closed);
                if (!refuseSystemCall(SYS_openat, ENOENT)) return 2;
                prepareProcess();
                return 0;
              }),
              1);
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "A standard stream is closed, and /dev/null cannot be opened.\n");
  }
}

struct End {
  int status;
  std::string output;
  std::string error;
  std::vector<std::string> files;  // that stayed
};

/// The end of a process that has printed a line and writes two files when something happens to it.
End endAfter(const std::function<void()>& happen) {
  const TemporaryDirectory directory;
  testing::internal::CaptureStdout();
  testing::internal::CaptureStderr();
  const int status = exitStatusOfChild([&] {
    prepareProcess();
    ErrorSlot error;
    TemporaryFile first;
    TemporaryFile second;
    if (!first.create(directory / "first", error)) return 2;
    if (!second.create(directory / "second", error)) return 3;
    writeToStandardOutput("a line\n");
    happen();
    return 4;
  });
  return {status, testing::internal::GetCapturedStdout(), testing::internal::GetCapturedStderr(),
          directory.names()};
}

void exhaustMemory() {
  std::get_new_handler()();
}

void expectOneMessageAndNoFiles(const std::function<void()>& happen) {
  const End end = endAfter(happen);
  EXPECT_EQ(end.status, 1);
  EXPECT_EQ(end.output, "a line\n");
  EXPECT_EQ(end.error, "Out of memory.\n");
  EXPECT_EQ(end.files, std::vector<std::string>());
}

TEST(ProcessTest, ExhaustedMemoryEndsIt) {
  expectOneMessageAndNoFiles(&exhaustMemory);
}

TEST(ProcessTest, ThreadsThatExhaustMemoryEndItOnce) {
  expectOneMessageAndNoFiles([] { std::thread(&exhaustMemory).join(); });
  expectOneMessageAndNoFiles([] {
    std::thread another(&exhaustMemory);
    exhaustMemory();
    another.join();
  });
}

}  // namespace
}  // namespace platform
