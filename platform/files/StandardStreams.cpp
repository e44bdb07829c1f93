#include "platform/files/StandardStreams.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <cstdio>

#include "platform/files/FileManager.h"
#include "platform/files/PosixError.h"

namespace platform {
namespace {

/// The errno value of the first write to standard output that failed; 0 without one.
int& outputFailure() {
  static int code = 0;
  return code;
}

ssize_t writeBuffered(void* /*cookie*/, const char* bytes, std::size_t length) {
  if (writeAll(STDOUT_FILENO, {bytes, length})) return static_cast<ssize_t>(length);
  if (outputFailure() == 0) outputFailure() = errno;
  return 0;
}

bool isTerminal(int descriptor) {
  return ::isatty(descriptor) == 1;
}

ControlCharacters controlsOf(int descriptor) {
  return isTerminal(descriptor) ? ControlCharacters::kAreReplaced : ControlCharacters::kStay;
}

/// The buffer in front of standard output. The C library's own stream loses what it holds when a
/// write is interrupted or would block.
std::FILE* outputStream() {
  static std::FILE* const stream = [] {
    cookie_io_functions_t functions{};
    functions.write = &writeBuffered;
    std::FILE* made = ::fopencookie(nullptr, "w", functions);
    if (made == nullptr) return stdout;
    // A line is seen at once where somebody is looking.
    std::setvbuf(made, nullptr, isTerminal(STDOUT_FILENO) ? _IOLBF : _IOFBF, BUFSIZ);
    return made;
  }();
  return stream;
}

}  // namespace

std::string readStandardInput() {
  std::string bytes;
  readToEnd(STDIN_FILENO, 0, kWholeReadLimit, bytes);
  return bytes;
}

ControlCharacters controlsOfStandardOutput() {
  return controlsOf(STDOUT_FILENO);
}

ControlCharacters controlsOfStandardError() {
  return controlsOf(STDERR_FILENO);
}

void writeToStandardOutput(std::string_view text) {
  std::fwrite(text.data(), 1, text.size(), outputStream());
}

void flushStandardOutput() {
  std::fflush(outputStream());
}

bool flushStandardOutput(ErrorSlot& error) {
  flushStandardOutput();
  if (outputFailure() == 0 || outputFailure() == EPIPE) return true;
  error = posixError(outputFailure());
  return false;
}

void writeToStandardError(std::string_view text) {
  writeAll(STDERR_FILENO, text);
}

OutputFile::OutputFile(const std::string& path, Mode mode) {
  flushStandardOutput();  // the path may be another name of it
  if (path == kStandardOutputPath) {
    descriptor_ = STDOUT_FILENO;
    return;
  }
  const int treatment = mode == Mode::kAppend ? O_APPEND | O_NONBLOCK : O_TRUNC;
  file_ = FileDescriptor::open(path, O_WRONLY | O_CREAT | treatment, 0666);
  descriptor_ = file_.get();
}

bool OutputFile::write(std::string_view bytes) {
  if (descriptor_ >= 0 && writeAll(descriptor_, bytes)) return true;
  descriptor_ = -1;
  return false;
}

}  // namespace platform
