#include "platform/files/Process.h"

#include <fcntl.h>
#include <malloc.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <initializer_list>

namespace platform {

namespace {

/// What one stage of a run gives back, such as the bytes of a feed, the next one soon asks for. It
/// would cost a tenth of the run to have the system take it and clear it anew.
void keepFreedMemory() {
#ifdef __GLIBC__
  constexpr int kNever = -1;
  constexpr int kGrowth = 4 << 20;  // bytes
  mallopt(M_MMAP_MAX, 0);
  mallopt(M_TRIM_THRESHOLD, kNever);
  mallopt(M_TOP_PAD, kGrowth);
#endif
}

}  // namespace

void prepareProcess() {
  std::signal(SIGPIPE, SIG_IGN);
  std::signal(SIGXFSZ, SIG_IGN);
  for (const int descriptor : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
    // Those below it are open, so that the lowest free one, which open gives, is this one.
    if (::fcntl(descriptor, F_GETFD) < 0 && errno == EBADF) {
      ::open("/dev/null", O_RDWR);
    }
  }
  keepFreedMemory();
}

}  // namespace platform
