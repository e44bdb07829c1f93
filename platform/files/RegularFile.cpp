#include "platform/files/RegularFile.h"

#include <fcntl.h>
#include <linux/magic.h>
#include <sys/stat.h>
#include <sys/statfs.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdint>

#include "platform/files/PosixError.h"

namespace platform {
namespace {

/// Judges what a successful stat found; fills the slot for anything but a regular file.
bool isRegular(const struct stat& status, ErrorSlot& error) {
  if (S_ISREG(status.st_mode)) return true;
  error = S_ISDIR(status.st_mode) ? posixError(EISDIR) : posixError(EINVAL, "Not a regular file");
  return false;
}

/// Refuses what the kernel makes up while it is read: it shows the state of the process (its
/// environment, for one) and of the machine, and may never end.
bool isStored(int descriptor, ErrorSlot& error) {
  // Those that are mounted below /proc and /sys have types of their own.
  constexpr std::uint32_t kConfigFS = 0x62656570;  // these have no names in the kernel's header
  constexpr std::uint32_t kFuseControl = 0x65735543;
  constexpr std::uint32_t kMessageQueues = 0x19800202;
  constexpr std::uint32_t kNFSServer = 0x6E667364;
  constexpr std::uint32_t kRemoteCalls = 0x67596969;
  constexpr std::array<std::uint32_t, 20> kOfTheKernel = {
      PROC_SUPER_MAGIC, SYSFS_MAGIC,  DEBUGFS_MAGIC,      TRACEFS_MAGIC,        SECURITYFS_MAGIC,
      SELINUX_MAGIC,    SMACK_MAGIC,  CGROUP_SUPER_MAGIC, CGROUP2_SUPER_MAGIC,  PSTOREFS_MAGIC,
      EFIVARFS_MAGIC,   BPF_FS_MAGIC, BINFMTFS_MAGIC,     RDTGROUP_SUPER_MAGIC, XENFS_SUPER_MAGIC,
      kConfigFS,        kFuseControl, kMessageQueues,     kNFSServer,           kRemoteCalls};
  struct statfs status {};
  if (::fstatfs(descriptor, &status) != 0) {
    error = posixError(errno);
    return false;
  }
  const auto type = static_cast<std::uint32_t>(status.f_type);
  if (std::find(kOfTheKernel.begin(), kOfTheKernel.end(), type) == kOfTheKernel.end()) return true;
  error = posixError(EINVAL, "Not a stored file");
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
  if (!isRegular(status, error) || !isStored(descriptor.get(), error)) return std::nullopt;
  static_assert(sizeof(status.st_size) == sizeof(std::uint64_t));
  return RegularFile(std::move(descriptor), static_cast<std::uint64_t>(status.st_size),
                     {status.st_mode & kPermissions, status.st_mtim});
}

bool RegularFile::hasChanged() const {
  struct stat status {};
  return ::fstat(descriptor_.get(), &status) != 0 ||
         static_cast<std::uint64_t>(status.st_size) != size_ ||
         status.st_mtim.tv_sec != attributes_.modified->tv_sec ||
         status.st_mtim.tv_nsec != attributes_.modified->tv_nsec;
}

std::optional<std::size_t> RegularFile::read(std::span<char> buffer, ErrorSlot& error) {
  // Nothing is waited for: a file that says that it has to be is no ordinary one.
  ssize_t count = -1;
  do {
    count = ::read(descriptor_.get(), buffer.data(), buffer.size());
  } while (count < 0 && errno == EINTR);
  if (count < 0) {
    error = posixError(errno);
    return std::nullopt;
  }
  return static_cast<std::size_t>(count);
}

}  // namespace platform
