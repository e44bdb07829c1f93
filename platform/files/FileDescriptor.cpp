#include "platform/files/FileDescriptor.h"

#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

namespace platform {
namespace {

constexpr std::size_t kChunkSize = std::size_t{64} << 10U;

/// Whether a call that failed can be made again: it was interrupted, or has to wait, which is done
/// here. A standard stream is non-blocking where another process that shares it made it so.
bool canTryAgain(int descriptor, short events) {
  pollfd request{descriptor, events, 0};
  if (errno == EAGAIN && ::poll(&request, 1, -1) > 0) return true;
  return errno == EINTR;  // of the call or of the wait
}

}  // namespace

FileDescriptor FileDescriptor::open(const std::string& path, int flags, unsigned mode) {
  return openAt(AT_FDCWD, path, flags, mode);
}

FileDescriptor FileDescriptor::openAt(int directory, const std::string& path, int flags,
                                      unsigned mode) {
  if (path.find('\0') != std::string::npos) {
    errno = EINVAL;
    return {};
  }
  int descriptor = -1;
  do {
    descriptor = ::openat(directory, path.c_str(), flags | O_CLOEXEC | O_NOCTTY, mode);
  } while (descriptor < 0 && errno == EINTR);
  return FileDescriptor(descriptor);
}

bool FileDescriptor::close() {
  const int descriptor = std::exchange(descriptor_, -1);
  return descriptor < 0 || ::close(descriptor) == 0;
}

bool isSynced(int (*call)(int), int descriptor) {
  int result = -1;
  do {
    result = call(descriptor);
  } while (result != 0 && errno == EINTR);
  return result == 0 || errno == EINVAL || errno == ENOSYS || errno == EOPNOTSUPP;
}

bool writeAll(int descriptor, std::string_view bytes) {
  while (!bytes.empty()) {
    const ssize_t count = ::write(descriptor, bytes.data(), bytes.size());
    if (count > 0) {
      bytes.remove_prefix(static_cast<std::size_t>(count));
    } else if (count == 0) {
      errno = EIO;
      return false;
    } else if (!canTryAgain(descriptor, POLLOUT)) {
      return false;
    }
  }
  return true;
}

std::ptrdiff_t readSome(int descriptor, char* buffer, std::size_t capacity) {
  ssize_t count = -1;
  do {
    count = ::read(descriptor, buffer, capacity);
  } while (count < 0 && canTryAgain(descriptor, POLLIN));
  return count;
}

bool readToEnd(int descriptor, std::size_t expectedSize, std::size_t limit, std::string& bytes) {
  // The byte beyond the expected size lets the end be seen without growing; the one beyond the
  // limit tells a longer input from one that just fits.
  bytes.resize(std::min(std::max(expectedSize, kChunkSize - 1), limit) + 1);
  std::size_t length = 0;
  std::ptrdiff_t count = 0;
  while (length <= limit &&
         (count = readSome(descriptor, bytes.data() + length, bytes.size() - length)) > 0) {
    length += static_cast<std::size_t>(count);
    if (length == bytes.size()) bytes.resize(std::min(length * 2, limit + 1));
  }
  if (length > limit) {
    count = -1;
    errno = EFBIG;
  }
  bytes.resize(std::min(length, limit));
  return count == 0;
}

}  // namespace platform
