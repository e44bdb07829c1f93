#include "tests/support/InterposedCalls.h"

#include <sys/file.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

InterposedCalls& interposedCalls() {
  static InterposedCalls calls;
  return calls;
}

// The linker takes these for those of the C library.
extern "C" {

int flock(int descriptor, int operation) noexcept {
  const auto& answer = interposedCalls().flock;
  return answer ? answer(descriptor, operation)
                : static_cast<int>(::syscall(SYS_flock, descriptor, operation));
}

int getentropy(void* buffer, std::size_t length) {
  const auto& answer = interposedCalls().getentropy;
  if (answer) return answer(buffer, length);
  return ::syscall(SYS_getrandom, buffer, length, 0) == static_cast<long>(length) ? 0 : -1;
}

int mkdir(const char* path, mode_t mode) noexcept {
  const auto& answer = interposedCalls().mkdir;
  return answer ? answer(path, mode) : static_cast<int>(::syscall(SYS_mkdir, path, mode));
}

}  // extern "C"
