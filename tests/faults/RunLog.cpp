#include "tests/faults/RunLog.h"

#include <fcntl.h>
#include <sys/syscall.h>

#include <algorithm>
#include <array>
#include <cstddef>

#include "tests/faults/RawSystemCall.h"

namespace {

constexpr int kLowestDescriptor = 900;

int logDescriptor = -1;

}  // namespace

bool RunLog::open(const char* path) {
  const long opened = rawSystemCall(SYS_openat, AT_FDCWD, reinterpret_cast<long>(path),
                                    O_WRONLY | O_CREAT | O_TRUNC | O_APPEND | O_CLOEXEC, 0666);
  if (opened < 0) return false;
  const long moved = rawSystemCall(SYS_fcntl, opened, F_DUPFD_CLOEXEC, kLowestDescriptor);
  rawSystemCall(SYS_close, opened);
  logDescriptor = static_cast<int>(moved);
  return moved >= 0;
}

void RunLog::line(std::initializer_list<std::string_view> fields) {
  if (logDescriptor < 0) return;
  std::array<char, 2048> text;
  std::size_t length = 0;
  for (const std::string_view field : fields) {
    const std::size_t room = text.size() - length - 1;
    length += field.substr(0, room).copy(text.data() + length, room);
    text[length++] = '\t';
    length = std::min(length, text.size() - 1);
  }
  text[length == 0 ? length++ : length - 1] = '\n';
  rawSystemCall(SYS_write, logDescriptor, reinterpret_cast<long>(text.data()),
                static_cast<long>(length));
}

int RunLog::descriptor() {
  return logDescriptor;
}
