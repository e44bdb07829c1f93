#include "platform/files/StandardStreams.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdio>
#include <functional>
#include <thread>

#include "platform/files/FileDescriptor.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/PseudoTerminal.h"
#include "tests/support/RefusedSystemCall.h"
#include "tests/support/TemporaryDirectory.h"

namespace platform {
namespace {

/// Two connected ends; what is written to the second comes out of the first.
struct Connection {
  FileDescriptor readEnd;
  FileDescriptor writeEnd;
};

Connection connectionOf(const std::array<int, 2>& ends) {
  return {FileDescriptor(ends[0]), FileDescriptor(ends[1])};
}

Connection makePipe() {
  std::array<int, 2> ends{-1, -1};
  EXPECT_EQ(::pipe(ends.data()), 0);
  return connectionOf(ends);
}

Connection makeSocketPair() {
  std::array<int, 2> ends{-1, -1};
  EXPECT_EQ(::socketpair(AF_UNIX, SOCK_STREAM, 0, ends.data()), 0);
  return connectionOf(ends);
}

void makeNonBlocking(const FileDescriptor& descriptor) {
  ASSERT_EQ(::fcntl(descriptor.get(), F_SETFL, O_NONBLOCK), 0);
}

std::string allFrom(const FileDescriptor& descriptor) {
  std::string bytes;
  EXPECT_TRUE(readToEnd(descriptor.get(), 0, 1U << 30U, bytes));
  return bytes;
}

/// More than a pipe holds.
std::string longText() {
  std::string text;
  for (int line = 0; line < 60000; ++line) text += std::to_string(line) + "\n";
  return text;
}

class StandardStreamsTest : public testing::Test {
 protected:
  /// Whether a condition holds in a process of its own whose standard output is the descriptor.
  static bool holdsWithOutput(const FileDescriptor& output,
                              const std::function<bool()>& condition) {
    return holdsInChild([&] { return ::dup2(output.get(), STDOUT_FILENO) >= 0 && condition(); });
  }

  TemporaryDirectory directory_;
};

TEST_F(StandardStreamsTest, ReadsStandardInputInPiecesToItsEnd) {
  const std::string text = longText();
  for (const bool isNonBlocking : {false, true}) {
    SCOPED_TRACE(isNonBlocking ? "non-blocking" : "blocking");
    Connection pipe = makePipe();
    if (isNonBlocking) makeNonBlocking(pipe.readEnd);
    std::thread writer([&] {
      writeAll(pipe.writeEnd.get(), text.substr(0, 10));
      ::usleep(20000);
      writeAll(pipe.writeEnd.get(), text.substr(10));
      pipe.writeEnd.close();
    });
    const FileDescriptor saved(::dup(STDIN_FILENO));
    ::dup2(pipe.readEnd.get(), STDIN_FILENO);
    const std::string bytes = readStandardInput();
    const std::string again = readStandardInput();
    ::dup2(saved.get(), STDIN_FILENO);
    writer.join();
    EXPECT_TRUE(bytes == text) << bytes.size() << " bytes";
    EXPECT_EQ(again, "");
  }
}

TEST_F(StandardStreamsTest, UnreadableStandardInputIsEmpty) {
  EXPECT_TRUE(holdsInChild([&] {
    const FileDescriptor directory = FileDescriptor::open(directory_.path(), O_RDONLY);
    ::dup2(directory.get(), STDIN_FILENO);
    return readStandardInput().empty() && ::close(STDIN_FILENO) == 0 && readStandardInput().empty();
  }));
}

TEST_F(StandardStreamsTest, StandardInputThatCannotBeWaitedForIsItsEnd) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  const Connection pipe = makePipe();
  makeNonBlocking(pipe.readEnd);
  ASSERT_TRUE(writeAll(pipe.writeEnd.get(), "first"));
  EXPECT_TRUE(holdsInChild([&] {
    ::dup2(pipe.readEnd.get(), STDIN_FILENO);
    return refuseSystemCall(kPollCall, ENOMEM) && readStandardInput() == "first";
  }));
}

TEST_F(StandardStreamsTest, StandardErrorIsNotBuffered) {
  const std::string path = directory_ / "err";
  EXPECT_TRUE(holdsInChild([&] {
    ::dup2(::open(path.c_str(), O_WRONLY | O_CREAT, 0600), STDERR_FILENO);
    writeToStandardError("first, ");
    const bool isWritten = contentOf(path) == "first, ";
    writeToStandardError(std::string("a\0b\n", 4));
    return isWritten;
  }));
  EXPECT_EQ(contentOf(path), std::string("first, a\0b\n", 11));
}

TEST_F(StandardStreamsTest, StandardOutputIsWrittenWhenFlushed) {
  const std::string path = directory_.addFile("out", "");
  EXPECT_TRUE(holdsWithOutput(FileDescriptor::open(path, O_WRONLY), [&] {
    writeToStandardOutput("progress");
    const bool isBuffered = contentOf(path).empty();
    flushStandardOutput();
    return isBuffered && contentOf(path) == "progress";
  }));
}

TEST_F(StandardStreamsTest, PrintedTextWaitsForANonBlockingOutput) {
  const std::string text = longText();
  Connection pipe = makePipe();
  makeNonBlocking(pipe.writeEnd);
  std::string bytes;
  std::thread reader([&] {
    ::usleep(20000);
    bytes = allFrom(pipe.readEnd);
  });
  EXPECT_TRUE(holdsWithOutput(pipe.writeEnd, [&] {
    writeToStandardOutput(text);
    flushStandardOutput();
    return true;
  }));
  pipe.writeEnd.close();
  reader.join();
  EXPECT_TRUE(bytes == text) << bytes.size() << " bytes";
}

TEST_F(StandardStreamsTest, PrintedTextThatIsRefusedIsTold) {
  ErrorSlot error;
  EXPECT_TRUE(holdsWithOutput(FileDescriptor::open("/dev/null", O_WRONLY), [&] {
    writeToStandardOutput("taken");
    return flushStandardOutput(error) && !error;
  }));
  EXPECT_TRUE(holdsWithOutput(FileDescriptor::open("/dev/full", O_WRONLY), [&] {
    writeToStandardOutput("refused");
    flushStandardOutput();
    // By an earlier call, whatever befalls those behind it.
    std::array<int, 2> pipe{};
    std::signal(SIGPIPE, SIG_IGN);
    if (::pipe(pipe.data()) != 0 || ::close(pipe[0]) != 0) return false;
    if (::dup2(pipe[1], STDOUT_FILENO) < 0) return false;
    writeToStandardOutput("never read");
    return !flushStandardOutput(error) && error->code == ENOSPC;
  }));
}

TEST_F(StandardStreamsTest, PrintedTextThatIsRefusedIsGone) {
  const std::string path = directory_.addFile("out", "");
  EXPECT_TRUE(holdsWithOutput(FileDescriptor::open("/dev/full", O_WRONLY), [&] {
    writeToStandardOutput("refused");
    flushStandardOutput();
    ::dup2(FileDescriptor::open(path, O_WRONLY).get(), STDOUT_FILENO);
    writeToStandardOutput("taken");
    flushStandardOutput();
    return contentOf(path) == "taken";
  }));
}

TEST_F(StandardStreamsTest, ControlCharactersAreReplacedOnATerminalAlone) {
  const PseudoTerminal terminal;
  const FileDescriptor file = FileDescriptor::open(directory_ / "out", O_WRONLY | O_CREAT, 0600);
  const Connection pipe = makePipe();
  for (const FileDescriptor* other : {&file, &pipe.writeEnd}) {
    EXPECT_TRUE(holdsInChild([&] {
      ::dup2(terminal.screen(), STDOUT_FILENO);
      ::dup2(other->get(), STDERR_FILENO);
      return controlsOfStandardOutput() == ControlCharacters::kAreReplaced &&
             controlsOfStandardError() == ControlCharacters::kStay;
    }));
    EXPECT_TRUE(holdsInChild([&] {
      ::dup2(other->get(), STDOUT_FILENO);
      ::dup2(terminal.screen(), STDERR_FILENO);
      return controlsOfStandardOutput() == ControlCharacters::kStay &&
             controlsOfStandardError() == ControlCharacters::kAreReplaced;
    }));
  }
}

TEST_F(StandardStreamsTest, OutputFileReplacesOrAppends) {
  const std::string path = directory_.addFile("out", "a longer old content");
  {
    OutputFile file(path, OutputFile::Mode::kReplace);
    EXPECT_TRUE(file.write("new"));
    EXPECT_TRUE(file.write(""));
    EXPECT_TRUE(file.write(" text"));
  }
  EXPECT_EQ(contentOf(path), "new text");
  EXPECT_TRUE(OutputFile(path, OutputFile::Mode::kAppend).write("\n"));
  EXPECT_EQ(contentOf(path), "new text\n");
  EXPECT_TRUE(OutputFile(directory_ / "other", OutputFile::Mode::kAppend).write("\n"));
  EXPECT_EQ(contentOf(directory_ / "other"), "\n");
}

TEST_F(StandardStreamsTest, OutputFileThatCannotBeOpenedTakesNothing) {
  for (const std::string& path :
       {std::string(), directory_.path(), directory_ / "missing/out",
        directory_.addFile("file", "") + "/out", directory_ / std::string("a\0b", 3)}) {
    OutputFile file(path, OutputFile::Mode::kReplace);
    EXPECT_FALSE(file.write("x")) << path;
  }
}

TEST_F(StandardStreamsTest, FullOutputFileTellsSo) {
  OutputFile file("/dev/full", OutputFile::Mode::kReplace);
  EXPECT_FALSE(file.write("x"));

  EXPECT_TRUE(holdsInChild([&] {
    ::signal(SIGXFSZ, SIG_IGN);
    const rlimit limit{5, 5};
    ::setrlimit(RLIMIT_FSIZE, &limit);
    OutputFile limited(directory_ / "out", OutputFile::Mode::kReplace);
    return !limited.write("0123456789") && !limited.write("");
  }));
  EXPECT_EQ(contentOf(directory_ / "out"), "01234");
}

TEST_F(StandardStreamsTest, OutputFileServesFIFOs) {
  const std::string path = directory_ / "fifo";
  ASSERT_EQ(::mkfifo(path.c_str(), 0600), 0);
  const std::string text = longText();
  bool written = false;
  std::thread writer([&] { written = OutputFile(path, OutputFile::Mode::kReplace).write(text); });
  const FileDescriptor reader = FileDescriptor::open(path, O_RDONLY);
  const std::string received = allFrom(reader);
  writer.join();
  EXPECT_TRUE(written);
  EXPECT_TRUE(received == text) << received.size() << " bytes";
}

TEST_F(StandardStreamsTest, ToAppendToAFIFOWaitsForNoReader) {
  const std::string path = directory_ / "fifo";
  ASSERT_EQ(::mkfifo(path.c_str(), 0600), 0);
  EXPECT_FALSE(OutputFile(path, OutputFile::Mode::kAppend).write("\n"));

  // With a reader it waits until all is taken.
  const FileDescriptor reader = FileDescriptor::open(path, O_RDONLY | O_NONBLOCK);
  const std::string text = longText();
  bool written = false;
  std::thread writer([&] { written = OutputFile(path, OutputFile::Mode::kAppend).write(text); });
  std::string received;
  while (received.size() < text.size()) {
    std::array<char, 4096> bytes{};
    const std::ptrdiff_t count = readSome(reader.get(), bytes.data(), bytes.size());
    if (count > 0) received.append(bytes.data(), static_cast<std::size_t>(count));
  }
  writer.join();
  EXPECT_TRUE(written);
  EXPECT_TRUE(received == text);
}

// As with ">>" in a shell: what was there stays, and the order is that of the calls.
TEST_F(StandardStreamsTest, StandardOutputPathAppendsBehindWhatWasPrinted) {
  const std::string path = directory_.addFile("out", "before\n");
  EXPECT_TRUE(holdsWithOutput(FileDescriptor::open(path, O_WRONLY | O_APPEND), [] {
    const std::string standardOutput(kStandardOutputPath);
    writeToStandardOutput("progress\n");
    const bool replaced = OutputFile(standardOutput, OutputFile::Mode::kReplace).write("feed");
    const bool appended = OutputFile(standardOutput, OutputFile::Mode::kAppend).write("\n");
    writeToStandardOutput("done\n");
    flushStandardOutput();
    return replaced && appended;
  }));
  EXPECT_EQ(contentOf(path), "before\nprogress\nfeed\ndone\n");
}

TEST_F(StandardStreamsTest, StandardOutputPathServesPipesAndSockets) {
  const std::string text = longText();
  for (const bool isSocket : {false, true}) {
    for (const bool isNonBlocking : {false, true}) {
      SCOPED_TRACE(testing::Message()
                   << "socket " << isSocket << " non-blocking " << isNonBlocking);
      Connection connection = isSocket ? makeSocketPair() : makePipe();
      if (isNonBlocking) makeNonBlocking(connection.writeEnd);
      std::string received;
      std::thread reader([&] {
        ::usleep(20000);
        received = allFrom(connection.readEnd);
      });
      EXPECT_TRUE(holdsWithOutput(connection.writeEnd, [&] {
        return OutputFile(std::string(kStandardOutputPath), OutputFile::Mode::kReplace).write(text);
      }));
      connection.writeEnd.close();
      reader.join();
      EXPECT_TRUE(received == text) << received.size() << " bytes";
    }
  }
}

TEST_F(StandardStreamsTest, ClosedPipeIsAFailedWrite) {
  Connection pipe = makePipe();
  pipe.readEnd.close();
  EXPECT_TRUE(holdsWithOutput(pipe.writeEnd, [] {
    ::signal(SIGPIPE, SIG_IGN);
    return !OutputFile(std::string(kStandardOutputPath), OutputFile::Mode::kReplace).write("x");
  }));
}

}  // namespace
}  // namespace platform
