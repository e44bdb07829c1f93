#include "platform/files/Process.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>

#include "tests/support/ChildProcess.h"
#include "tests/support/TemporaryDirectory.h"

namespace platform {
namespace {

TEST(ProcessTest, ClosedPipeIsAFailedWrite) {
  EXPECT_EQ(exitStatusOfChild([] {
              ::signal(SIGPIPE, SIG_DFL);
              prepareProcess();
              std::array<int, 2> ends{};
              if (::pipe(ends.data()) != 0) {
                return 1;
              }
              ::close(ends[0]);
              return ::write(ends[1], "x", 1) == -1 && errno == EPIPE ? 0 : 2;
            }),
            0);
}

TEST(ProcessTest, FileBeyondTheLimitIsAFailedWrite) {
  const TemporaryDirectory directory;
  const std::string path = directory.addFile("file", "");
  EXPECT_EQ(exitStatusOfChild([&] {
              ::signal(SIGXFSZ, SIG_DFL);
              prepareProcess();
              const rlimit limit{0, 0};
              ::setrlimit(RLIMIT_FSIZE, &limit);
              const int file = ::open(path.c_str(), O_WRONLY);
              return ::write(file, "x", 1) == -1 && errno == EFBIG ? 0 : 1;
            }),
            0);
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
                  if ((closed >> static_cast<unsigned>(descriptor) & 1U) != 0) {
                    ::close(descriptor);
                  }
                }
                ::close(file);
                prepareProcess();
                for (int descriptor = 0; descriptor < 3; ++descriptor) {
                  const bool wasClosed = (closed >> static_cast<unsigned>(descriptor) & 1U) != 0;
                  if (isOpenOnNothing(descriptor) != wasClosed) {
                    return 1;
                  }
                }
                return ::open(path.c_str(), O_RDONLY) > 2 ? 0 : 2;
              }),
              0);
  }
}

}  // namespace
}  // namespace platform
