#include "platform/files/RegularFile.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>

#include "platform/files/PosixError.h"

namespace platform {
namespace {

/// Judges what a successful stat found; fills the slot for anything but a regular file.
bool isRegular(const struct stat& status, ErrorSlot& error) {
  if (S_ISREG(status.st_mode)) return true;
  error = S_ISDIR(status.st_mode) ? posixError(EISDIR) : posixError(EINVAL, "Not a regular file");
  return false;
}

}  // namespace

std::optional<RegularFile> RegularFile::open(const std::string& path, ErrorSlot& error) {
  // Opening a device can act on it, so it is looked at before, and again afterwards in case it was
  // exchanged in between.
  struct stat status {};
  if (path.find('\0') == std::string::npos && ::stat(path.c_str(), &status) == 0 &&
      !isRegular(status, error)) {
    return std::nullopt;
  }
  FileDescriptor descriptor = FileDescriptor::open(path, O_RDONLY | O_NONBLOCK);
  if (!descriptor.isOpen() || ::fstat(descriptor.get(), &status) != 0) {
    error = posixError(errno);
    return std::nullopt;
  }
  if (!isRegular(status, error)) return std::nullopt;
  static_assert(sizeof(status.st_size) == sizeof(std::uint64_t));
  return RegularFile(std::move(descriptor), static_cast<std::uint64_t>(status.st_size),
                     {status.st_mode & kPermissions, status.st_mtim});
}

bool RegularFile::isShorterNow() const {
  struct stat status {};
  return ::fstat(descriptor_.get(), &status) != 0 ||
         static_cast<std::uint64_t>(status.st_size) < size_;
}

std::optional<std::size_t> RegularFile::read(std::span<char> buffer, ErrorSlot& error) {
  const std::ptrdiff_t count = readSome(descriptor_.get(), buffer.data(), buffer.size());
  if (count < 0) {
    error = posixError(errno);
    return std::nullopt;
  }
  return static_cast<std::size_t>(count);
}

}  // namespace platform
