#include "platform/Process.h"

#include <fcntl.h>
#include <unistd.h>

#include <csignal>
#include <initializer_list>

namespace platform {

void prepareProcess() {
  std::signal(SIGPIPE, SIG_IGN);
  std::signal(SIGXFSZ, SIG_IGN);
  for (const int descriptor : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
    // Those below it are open, so that the lowest free one, which open gives, is this one.
    if (::fcntl(descriptor, F_GETFD) < 0) {
      ::open("/dev/null", O_RDWR);
    }
  }
}

}  // namespace platform
