#include "platform/files/FileDescriptor.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/time.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <string>
#include <utility>

#include "tests/support/ChildProcess.h"
#include "tests/support/RefusedSystemCall.h"
#include "tests/support/TemporaryDirectory.h"

namespace platform {
namespace {

struct Pipe {
  Pipe() {
    std::array<int, 2> ends{-1, -1};
    EXPECT_EQ(::pipe(ends.data()), 0);
    readEnd = FileDescriptor(ends[0]);
    writeEnd = FileDescriptor(ends[1]);
  }
  FileDescriptor readEnd;
  FileDescriptor writeEnd;
};

/// Has a signal interrupt what this process waits for a moment later; its handler, which may call
/// only what a signal handler may, makes the end of the wait possible.
class Interruption {
 public:
  explicit Interruption(void (*handler)(int)) {
    struct sigaction action {};
    action.sa_handler = handler;  // and no SA_RESTART
    ::sigaction(SIGALRM, &action, &previous_);
    const itimerval soon{.it_interval = {}, .it_value = {.tv_sec = 0, .tv_usec = 50000}};
    ::setitimer(ITIMER_REAL, &soon, nullptr);
  }
  ~Interruption() { ::sigaction(SIGALRM, &previous_, nullptr); }
  Interruption(const Interruption&) = delete;
  Interruption& operator=(const Interruption&) = delete;

 private:
  struct sigaction previous_ {};
};

// For the handlers.
int handlersDescriptor = -1;
const char* handlersPath = nullptr;

TEST(FileDescriptorTest, MovesCloseWhatWasOpen) {
  Pipe pipe;
  const int kept = pipe.readEnd.get();
  const int closed = pipe.writeEnd.get();
  pipe.writeEnd = std::move(pipe.readEnd);
  EXPECT_FALSE(pipe.readEnd.isOpen());
  EXPECT_EQ(pipe.writeEnd.get(), kept);
  EXPECT_EQ(::fcntl(closed, F_GETFD), -1);
  EXPECT_NE(::fcntl(kept, F_GETFD), -1);
}

TEST(FileDescriptorTest, MoveToItselfKeepsItOpen) {
  Pipe pipe;
  FileDescriptor& same = pipe.readEnd;
  const int number = same.get();
  pipe.readEnd = std::move(same);
  EXPECT_EQ(pipe.readEnd.get(), number);
  EXPECT_NE(::fcntl(number, F_GETFD), -1);
}

TEST(FileDescriptorTest, ClosingTellsAFailedClose) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  FileDescriptor none;
  EXPECT_TRUE(none.close());
  EXPECT_TRUE(holdsInChild([] {
    Pipe pipe;
    return refuseSystemCall(SYS_close, EIO) && !pipe.writeEnd.close() && errno == EIO &&
           !pipe.writeEnd.isOpen();
  }));
}

TEST(FileDescriptorTest, OpeningGoesOnAfterASignal) {
  const TemporaryDirectory directory;
  const std::string fifo = directory / "fifo";
  ASSERT_EQ(::mkfifo(fifo.c_str(), 0600), 0);
  handlersPath = fifo.c_str();
  // Until the handler opens the other end, there is no reader.
  const Interruption interruption(
      [](int) { handlersDescriptor = ::open(handlersPath, O_RDONLY | O_NONBLOCK); });
  const FileDescriptor writer = FileDescriptor::open(fifo, O_WRONLY);
  const FileDescriptor reader(handlersDescriptor);
  EXPECT_TRUE(writer.isOpen());
  EXPECT_TRUE(reader.isOpen());
}

TEST(FileDescriptorTest, ReadingGoesOnAfterASignal) {
  for (const int flags : {0, O_NONBLOCK}) {
    const Pipe pipe;
    ::fcntl(pipe.readEnd.get(), F_SETFL, flags);
    handlersDescriptor = pipe.writeEnd.get();
    const Interruption interruption([](int) {
      if (::write(handlersDescriptor, "ab", 2) != 2) ::_exit(1);
    });
    std::array<char, 8> buffer{};
    ASSERT_EQ(readSome(pipe.readEnd.get(), buffer.data(), buffer.size()), 2);
    EXPECT_EQ(std::string(buffer.data(), 2), "ab");
  }
}

/// Fills the pipe, whose writing end is then blocking or not.
void fill(const Pipe& pipe, bool isBlocking) {
  const int flags = ::fcntl(pipe.writeEnd.get(), F_GETFL);
  ASSERT_EQ(::fcntl(pipe.writeEnd.get(), F_SETFL, flags | O_NONBLOCK), 0);
  const std::array<char, 4096> page{};
  while (::write(pipe.writeEnd.get(), page.data(), page.size()) > 0) {
  }
  if (isBlocking) {
    ASSERT_EQ(::fcntl(pipe.writeEnd.get(), F_SETFL, flags), 0);
  }
}

TEST(FileDescriptorTest, WritingGoesOnAfterASignal) {
  for (const bool isBlocking : {true, false}) {
    const Pipe pipe;
    fill(pipe, isBlocking);
    handlersDescriptor = pipe.readEnd.get();
    const Interruption interruption([](int) {
      std::array<char, 8192> drained;
      if (::read(handlersDescriptor, drained.data(), drained.size()) <= 0) ::_exit(1);
    });
    EXPECT_TRUE(writeAll(pipe.writeEnd.get(), std::string(4096, 'x')));
  }
}

TEST(FileDescriptorTest, WritingFailsWhereTheWaitFails) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  EXPECT_TRUE(holdsInChild([] {
    const Pipe pipe;
    fill(pipe, false);
    return refuseSystemCall(kPollCall, ENOMEM) && !writeAll(pipe.writeEnd.get(), "x") &&
           errno == ENOMEM;
  }));
}

TEST(FileDescriptorTest, WriteThatTakesNothingFails) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  EXPECT_TRUE(holdsInChild([] {
    const Pipe pipe;
    return refuseSystemCall(SYS_write, 0) && !writeAll(pipe.writeEnd.get(), "x") && errno == EIO;
  }));
}

TEST(FileDescriptorTest, ReadingStopsAtTheLimitWhateverSizeWasExpected) {
  const TemporaryDirectory directory;
  std::string content(200000, '\0');
  for (std::size_t index = 0; index < content.size(); ++index) {
    content[index] = static_cast<char>((index * 31 + index / 251) & 0xFFU);
  }
  const std::string path = directory.addFile("file", content);
  struct Row {
    std::size_t expectedSize;
    std::size_t limit;
    bool isRead;
  };
  for (const auto& [expectedSize, limit, isRead] : std::array<Row, 8>{{
           {200000, 200000, true},
           {200000, 199999, false},
           {0, 200000, true},
           {0, 199999, false},
           {5, 200001, true},
           {5, 100, false},
           {5, 0, false},
           {1000000, 500000, true},
       }}) {
    SCOPED_TRACE(testing::Message() << "expected " << expectedSize << ", limit " << limit);
    const FileDescriptor file = FileDescriptor::open(path, O_RDONLY);
    std::string bytes = "replaced";
    errno = 0;
    EXPECT_EQ(readToEnd(file.get(), expectedSize, limit, bytes), isRead);
    EXPECT_EQ(errno, isRead ? 0 : EFBIG);
    EXPECT_EQ(bytes, content.substr(0, limit));
  }
}

}  // namespace
}  // namespace platform
