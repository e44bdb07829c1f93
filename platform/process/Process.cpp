#include "platform/process/Process.h"

#include <fcntl.h>
#include <malloc.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <initializer_list>
#include <new>

#include "platform/files/StandardStreams.h"
#include "platform/files/TemporaryFile.h"
#include "platform/text/Memory.h"

namespace platform {
namespace {

/// Freed memory stays with the process: the next stage of a run needs it, and to give it back and
/// get it anew would cost a tenth of the run.
void keepFreedMemory() {
#ifdef __GLIBC__
  constexpr int kNever = -1;
  constexpr int kGrowth = 4 << 20;  // bytes
  mallopt(M_MMAP_MAX, 0);
  mallopt(M_TRIM_THRESHOLD, kNever);
  mallopt(M_TOP_PAD, kGrowth);
#endif
}

/// The new-handler. It runs on any thread, amid whatever asked for memory, and depends on none.
[[noreturn]] void endForWantOfMemory() {
  static std::atomic_flag isEnding;
  while (isEnding.test_and_set()) ::pause();  // another thread ends the process
  flushStandardOutput();
  writeToStandardError("Out of memory.\n");
  TemporaryFile::removeAllAndExit(EXIT_FAILURE);
}

}  // namespace

void prepareProcess() {
  std::signal(SIGPIPE, SIG_IGN);
  std::signal(SIGXFSZ, SIG_IGN);
  for (const int descriptor : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
    // Those below it are open, so that the lowest free one, which open gives, is this one.
    if (::fcntl(descriptor, F_GETFD) < 0 && errno == EBADF &&
        ::open("/dev/null", O_RDWR) != descriptor) {
      writeToStandardError("A standard stream is closed, and /dev/null cannot be opened.\n");
      ::_exit(EXIT_FAILURE);
    }
  }
  keepFreedMemory();
  std::set_new_handler(&endForWantOfMemory);
  Memory::serveICU();
}

}  // namespace platform
