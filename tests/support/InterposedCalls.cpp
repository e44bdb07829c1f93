#include "tests/support/InterposedCalls.h"

#include <fcntl.h>
#include <sys/syscall.h>
#include <unistd.h>

InterposedCalls& interposedCalls() {
  static InterposedCalls calls;
  return calls;
}

// The linker takes these for those of the C library.
// NOLINTBEGIN(readability-inconsistent-declaration-parameter-name)
extern "C" {

ssize_t copy_file_range(int source, off_t* sourceOffset, int target, off_t* targetOffset,
                        std::size_t length, unsigned flags) {
  const auto& answer = interposedCalls().copy_file_range;
  return answer ? answer(length)
                : ::syscall(SYS_copy_file_range, source, sourceOffset, target, targetOffset, length,
                            flags);
}

// There is a structure of this name, too.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wshadow"
int flock(int descriptor, int operation) noexcept {
  const auto& answer = interposedCalls().flock;
  return answer ? answer(descriptor, operation)
                : static_cast<int>(::syscall(SYS_flock, descriptor, operation));
}
#pragma GCC diagnostic pop

int fstat(int descriptor, struct stat* status) noexcept {
  const auto& answer = interposedCalls().fstat;
  return answer ? answer(descriptor, status) : ::fstatat(descriptor, "", status, AT_EMPTY_PATH);
}

int getentropy(void* buffer, std::size_t length) {
  const auto& answer = interposedCalls().getentropy;
  if (answer) return answer(buffer, length);
  return ::syscall(SYS_getrandom, buffer, length, 0) == static_cast<long>(length) ? 0 : -1;
}

int mkdir(const char* path, mode_t mode) noexcept {
  const auto& answer = interposedCalls().mkdir;
  return answer ? answer(path, mode) : ::mkdirat(AT_FDCWD, path, mode);
}

int renameat(int from, const char* oldPath, int to, const char* newPath) noexcept {
  const auto& answer = interposedCalls().renameat;
  return answer ? answer(from, oldPath, newPath)
                : static_cast<int>(::syscall(SYS_renameat, from, oldPath, to, newPath));
}

int stat(const char* path, struct stat* status) noexcept {
  const auto& answer = interposedCalls().stat;
  return answer ? answer(path, status) : ::fstatat(AT_FDCWD, path, status, 0);
}

}  // extern "C"
// NOLINTEND(readability-inconsistent-declaration-parameter-name)
