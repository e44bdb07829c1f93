#include "platform/files/Directory.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "platform/files/PosixError.h"

namespace platform {
namespace {

bool lookAt(int directory, const std::string& name, struct stat& status) {
  return isFileName(name) && ::fstatat(directory, name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0;
}

FileIdentity identityOf(const struct stat& status) {
  return {status.st_dev, status.st_ino};
}

std::optional<FileIdentity> identityOf(int descriptor) {
  struct stat status {};
  if (::fstat(descriptor, &status) != 0) return std::nullopt;
  return identityOf(status);
}

/// Whether everyone may make files in it and remove his own alone, as in /tmp.
bool isOfEveryone(const struct stat& status) {
  constexpr unsigned kEveryoneHisOwn = S_ISVTX | S_IWOTH;
  return (status.st_mode & kEveryoneHisOwn) == kEveryoneHisOwn;
}

/// Whether nobody but this user and root can have put the child under the name; a link can lead to
/// what is trusted, and still be a stranger's.
bool isTrusted(int parent, const std::string& name, int child) {
  struct stat above {};
  struct stat named {};
  if (::fstat(parent, &above) != 0) return false;
  if (!isOfEveryone(above)) return true;
  return lookAt(parent, name, named) && identityOf(named) == identityOf(child) &&
         (named.st_uid == ::geteuid() || named.st_uid == 0);
}

}  // namespace

bool isFileName(const std::string& name) {
  constexpr std::string_view kNotInNames("/\0", 2);
  return !name.empty() && name != "." && name != ".." &&
         name.find_first_of(kNotInNames) == std::string::npos;
}

std::optional<Directory> Directory::open(const std::string& path, ErrorSlot& error) {
  return openAt(AT_FDCWD, path, error);
}

std::optional<Directory> Directory::openAt(int parent, const std::string& path, ErrorSlot& error) {
  FileDescriptor descriptor = FileDescriptor::openAt(parent, path, O_RDONLY | O_DIRECTORY);
  const bool isReadable = descriptor.isOpen();
  if (!isReadable && errno == EACCES) {
    descriptor = FileDescriptor::openAt(parent, path, O_PATH | O_DIRECTORY);
  }
  if (descriptor.isOpen()) return Directory(std::move(descriptor), isReadable);
  error = posixError(errno);
  return std::nullopt;
}

std::optional<Directory> Directory::openOrMake(const std::string& name, ErrorSlot& error) const {
  if (!isFileName(name)) {
    error = posixError(EINVAL);
    return std::nullopt;
  }
  // What exists is not made, since a read-only file system may refuse before it looks.
  ErrorSlot fault;
  std::optional<Directory> child = openAt(descriptor(), name, fault);
  if (!child && fault->code == ENOENT) {
    const int failure = ::mkdirat(descriptor(), name.c_str(), 0777) == 0 ? 0 : errno;
    child = openAt(descriptor(), name, fault);
    if (!child && failure != 0) fault = posixError(failure);
  }
  if (!child) {
    error = fault;
    return std::nullopt;
  }
  if (!isTrusted(descriptor(), name, child->descriptor())) {
    error = posixError(EPERM, "Not a directory of one's own");
    return std::nullopt;
  }
  if (!child->isAtOrBelow(*this)) {
    error = posixError(EXDEV, "The link leads out of the directory");
    return std::nullopt;
  }
  return child;
}

/// Goes up from the directory that is open, whatever path led there: a link that is absolute leads
/// inside as well as one that is not, and one that is exchanged meanwhile changes nothing.
bool Directory::isAtOrBelow(const Directory& other) const {
  const std::optional<FileIdentity> goal = identityOf(other.descriptor());
  std::optional<FileIdentity> current = identityOf(descriptor());
  FileDescriptor place;
  while (goal && current && *current != *goal) {
    place = FileDescriptor::openAt(place.isOpen() ? place.get() : descriptor(), "..",
                                   O_PATH | O_DIRECTORY);
    const std::optional<FileIdentity> parent = identityOf(place.get());
    if (parent == current) return false;  // the root
    current = parent;
  }
  return goal && current;
}

bool Directory::isAt(const std::string& path) const {
  struct stat status {};
  return path.find('\0') == std::string::npos && ::stat(path.c_str(), &status) == 0 &&
         identityOf(status) == identityOf(descriptor());
}

bool Directory::containsLink(const std::string& name) const {
  struct stat status {};
  return lookAt(descriptor(), name, status) && S_ISLNK(status.st_mode);
}

std::optional<FileIdentity> Directory::identity(const std::string& name) const {
  struct stat status {};
  if (!lookAt(descriptor(), name, status)) return std::nullopt;
  return identityOf(status);
}

std::optional<std::uint64_t> Directory::fileSize(const std::string& name) const {
  struct stat status {};
  if (!lookAt(descriptor(), name, status) || !S_ISREG(status.st_mode)) return std::nullopt;
  return static_cast<std::uint64_t>(status.st_size);
}

std::optional<FileAttributes> Directory::attributesForSuccessor(const std::string& name) const {
  struct stat status {};
  if (!lookAt(descriptor(), name, status) || !S_ISREG(status.st_mode)) return std::nullopt;
  if (status.st_uid == ::geteuid()) return FileAttributes{status.st_mode & kPermissions, {}};
  if ((status.st_mode & S_IROTH) != 0) return std::nullopt;
  return FileAttributes{S_IRUSR | S_IWUSR, {}};
}

bool Directory::remove(const std::string& name, ErrorSlot& error) const {
  if (isFileName(name) && ::unlinkat(descriptor(), name.c_str(), 0) == 0) return true;
  error = posixError(isFileName(name) ? errno : EINVAL);
  return false;
}

Directory::Lock Directory::lock(Wait wait) {
  struct stat status {};
  if (::fstat(descriptor(), &status) != 0 || isOfEveryone(status)) return Lock::kNotToBeHad;
  int result = -1;
  do {
    result = ::flock(descriptor(), wait == Wait::kNot ? LOCK_EX | LOCK_NB : LOCK_EX);
  } while (result != 0 && errno == EINTR);
  isLocked_ = result == 0;
  if (isLocked_) return Lock::kTaken;
  return errno == EWOULDBLOCK ? Lock::kHeldByAnother : Lock::kNotToBeHad;
}

bool Directory::sync(ErrorSlot& error) const {
  return synced(&::fsync, error);
}

bool Directory::syncFileSystem(ErrorSlot& error) const {
  return synced(&::syncfs, error);
}

bool Directory::isOnFileSystemOf(const Directory& other) const {
  const std::optional<FileIdentity> mine = identityOf(descriptor());
  const std::optional<FileIdentity> theirs = identityOf(other.descriptor());
  return mine && theirs && mine->device == theirs->device;
}

bool Directory::synced(int (*call)(int), ErrorSlot& error) const {
  // What may not be read cannot be named to the call, so the whole system is synced instead.
  if (isOpen() && !isReadable_) {
    ::sync();
    return true;
  }
  if (isSynced(call, descriptor())) return true;
  error = posixError(errno);
  return false;
}

}  // namespace platform
