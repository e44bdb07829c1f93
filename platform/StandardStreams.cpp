#include "platform/StandardStreams.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "platform/FileManager.h"

namespace platform {

std::string readStandardInput() {
  std::string bytes;
  while (readToEnd(STDIN_FILENO, 0, kWholeReadLimit, bytes) == EAGAIN &&
         waitForInput(STDIN_FILENO)) {
  }
  return bytes;
}

void writeToStandardOutput(std::string_view text) {
  std::fwrite(text.data(), 1, text.size(), stdout);
}

void flushStandardOutput() {
  std::fflush(stdout);
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
  const int treatment = mode == Mode::kAppend ? O_APPEND : O_TRUNC;
  file_ = FileDescriptor::open(path, O_WRONLY | O_CREAT | treatment, 0666);
  descriptor_ = file_.get();
}

bool OutputFile::write(std::string_view bytes) {
  if (descriptor_ >= 0 && writeAll(descriptor_, bytes)) {
    return true;
  }
  descriptor_ = -1;
  return false;
}

}  // namespace platform
