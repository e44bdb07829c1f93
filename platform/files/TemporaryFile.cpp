#include "platform/files/TemporaryFile.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstddef>
#include <cstdio>
#include <ctime>
#include <memory>
#include <utility>

#include "platform/files/PosixError.h"
#include "platform/text/ASCII.h"

namespace platform {
namespace {

/// The name is short, so that it fits wherever the final name does, and random, so that runs that
/// share a directory do not meet.
constexpr std::string_view kNamePrefix = ".qel-";
constexpr std::string_view kNameSuffix = ".part";
constexpr std::size_t kRandomBytes = 8;

constexpr int kCreationAttempts = 100;

/// All signals by which the process ends unless it does something about them. Those that tell of a
/// fault of its own are left out: what it remembers of its files is not to be trusted then.
const sigset_t& endingSignals() {
  static const sigset_t signals = [] {
    constexpr std::array kOthers = {
        SIGABRT, SIGBUS,  SIGFPE,  SIGILL,  SIGSEGV, SIGSYS, SIGTRAP,   // faults
        SIGCHLD, SIGCONT, SIGTSTP, SIGTTIN, SIGTTOU, SIGURG, SIGWINCH,  // do not end it
        SIGKILL, SIGSTOP, SIGPIPE, SIGXFSZ                              // see prepareProcess
    };
    sigset_t result;
    ::sigfillset(&result);
    for (const int signal : kOthers) ::sigdelset(&result, signal);
    return result;
  }();
  return signals;
}

/// Empty, and errno set, when the system gives no random bytes.
std::string hiddenName() {
  std::array<unsigned char, kRandomBytes> random{};
  if (::getentropy(random.data(), random.size()) != 0) return {};
  std::string name(kNamePrefix);
  for (const unsigned char byte : random) {
    name += kHexDigits[byte >> 4U];
    name += kHexDigits[byte & 0xFU];
  }
  return name.append(kNameSuffix);
}

/// The lock says that the file's owner lives. Without waiting; false with EWOULDBLOCK when another
/// open file holds it, with other codes where the file system knows no locks.
bool lock(int descriptor) {
  int result = -1;
  do {
    result = ::flock(descriptor, LOCK_EX | LOCK_NB);
  } while (result != 0 && errno == EINTR);
  return result == 0;
}

bool isNamed(int descriptor, int directory, const std::string& name) {
  struct stat open {};
  struct stat named {};
  return ::fstat(descriptor, &open) == 0 &&
         ::fstatat(directory, name.c_str(), &named, AT_SYMLINK_NOFOLLOW) == 0 &&
         open.st_dev == named.st_dev && open.st_ino == named.st_ino;
}

bool moveReplacing(int directory, const char* from, const char* to) {
  return ::renameat(directory, from, directory, to) == 0;
}

bool moveNew(int directory, const char* from, const char* to) {
  if (::renameat2(directory, from, directory, to, RENAME_NOREPLACE) == 0) return true;
  if (errno != EINVAL && errno != ENOSYS) return false;
  // Some file systems (NFS) cannot rename that way. A link is refused for an existing name, too.
  if (::linkat(directory, from, directory, to, 0) == 0) {
    ::unlinkat(directory, from, 0);
    return true;
  }
  if (errno == EEXIST) return false;
  // Others (exFAT) have no links either. There an empty file, which is never made over another,
  // holds the name until it is replaced.
  const FileDescriptor holder(
      ::openat(directory, to, O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, S_IRUSR | S_IWUSR));
  if (!holder.isOpen()) return false;
  if (moveReplacing(directory, from, to)) return true;
  const int failure = errno;
  ::unlinkat(directory, to, 0);
  errno = failure;
  return false;
}

}  // namespace

/// The temporary files that exist at this moment, for the signal handler and the new-handler.
class TemporaryFile::Registry {
 public:
  /// While one exists, the handler neither runs on this thread nor reads the list on another: a
  /// library's helper threads may be given a signal as well. Nothing is allocated meanwhile: where
  /// memory runs out, the new-handler wants the list on the very thread that holds it.
  class Hold {
   public:
    Hold() {
      ::pthread_sigmask(SIG_BLOCK, &endingSignals(), &previous_);
      acquire();
    }
    ~Hold() {
      busy_.clear(std::memory_order_release);
      ::pthread_sigmask(SIG_SETMASK, &previous_, nullptr);
    }
    Hold(const Hold&) = delete;
    Hold& operator=(const Hold&) = delete;

   private:
    sigset_t previous_{};
  };

  /// Installs the handler for the signals that would end the process: one that is ignored (as under
  /// nohup) stays so, and a handler that somebody else installed stays, too.
  static void handleSignals() {
    static const bool isDone = [] {
      struct sigaction action {};
      action.sa_handler = &Registry::removeAllAndEnd;
      action.sa_mask = endingSignals();
      for (int signal = 1; signal <= SIGRTMAX; ++signal) {
        if (::sigismember(&action.sa_mask, signal) != 1) continue;
        struct sigaction current {};
        if (::sigaction(signal, nullptr, &current) == 0 && current.sa_handler == SIG_DFL) {
          ::sigaction(signal, &action, nullptr);
        }
      }
      return true;
    }();
    static_cast<void>(isDone);
  }

  static void add(TemporaryFile& file, const Hold&) { file.next_ = std::exchange(first_, &file); }

  /// The file has been added and not been removed since.
  static void remove(TemporaryFile& file, const Hold&) {
    TemporaryFile** link = &first_;
    while (*link != &file) link = &(*link)->next_;
    *link = std::exchange(file.next_, nullptr);
  }

  /// Only while the list is held.
  static void unlinkAll() {
    for (const TemporaryFile* file = first_; file != nullptr; file = file->next_) {
      ::unlinkat(file->directory_, file->hiddenName_.c_str(), 0);
    }
  }

 private:
  static void acquire() {
    while (busy_.test_and_set(std::memory_order_acquire)) {
    }
  }

  /// Ends the process by the signal's own action, so that its parent learns of the signal. The list
  /// is never released again: nothing is created any more.
  static void removeAllAndEnd(int signal) {
    acquire();
    unlinkAll();
    // The signal is blocked until the handler returns, and ends the process then.
    struct sigaction action {};
    action.sa_handler = SIG_DFL;
    ::sigaction(signal, &action, nullptr);
    ::raise(signal);
  }

  static inline std::atomic_flag busy_;
  static inline TemporaryFile* first_ = nullptr;
};

TemporaryFile::~TemporaryFile() {
  discard();
}

bool TemporaryFile::openDirectory(const FilePlace& place, ErrorSlot& error) {
  discard();
  const std::size_t parentLength =
      place.directory != nullptr ? 0 : place.name.rfind('/') + 1;  // npos + 1 is 0
  name_ = place.name.substr(parentLength);
  if (!isFileName(name_)) {
    error = posixError(place.name.empty() ? ENOENT : EINVAL);
    return false;
  }
  if (place.directory != nullptr) {
    directory_ = place.directory->descriptor();
    return true;
  }
  ownDirectory_ = FileDescriptor::open(parentLength == 0 ? "." : place.name.substr(0, parentLength),
                                       O_PATH | O_DIRECTORY);
  directory_ = ownDirectory_.get();
  if (directory_ < 0) error = posixError(errno);
  return directory_ >= 0;
}

bool TemporaryFile::create(const FilePlace& place, ErrorSlot& error,
                           const std::optional<FileAttributes>& attributes) {
  if (!openDirectory(place, error)) return false;
  attributes_ = attributes;
  needsLock_ = place.directory == nullptr || !place.directory->isLocked();
  isPart_ = false;
  Registry::handleSignals();
  return createHidden(error);
}

bool TemporaryFile::createPart(const FilePlace& place, const std::string& partName,
                               std::uint64_t keptSize, ErrorSlot& error) {
  constexpr unsigned kEveryone = 0666;
  if (!openDirectory(place, error)) return false;
  attributes_.reset();
  needsLock_ = false;
  isPart_ = true;
  if (!isFileName(partName)) return fail(EINVAL, error);
  // Another name of the same file would get the bytes as well; a new file has one.
  if (keptSize == 0 && ::unlinkat(directory_, partName.c_str(), 0) != 0 && errno != ENOENT) {
    return fail(errno, error);
  }
  const int flags = keptSize == 0 ? O_CREAT | O_EXCL : O_NONBLOCK;
  descriptor_ =
      FileDescriptor::openAt(directory_, partName, O_WRONLY | O_NOFOLLOW | flags, kEveryone);
  struct stat found {};
  if (!descriptor_.isOpen() || ::fstat(descriptor_.get(), &found) != 0) return fail(errno, error);
  const auto size = static_cast<off_t>(keptSize);
  if (!S_ISREG(found.st_mode) || found.st_nlink != 1 || found.st_size < size) {
    return fail(EINVAL, error);
  }
  if (::ftruncate(descriptor_.get(), size) != 0 || ::lseek(descriptor_.get(), size, SEEK_SET) < 0) {
    return fail(errno, error);
  }
  hiddenName_ = partName;
  return true;
}

bool TemporaryFile::fail(int code, ErrorSlot& error) {
  error = posixError(code);
  discard();
  return false;
}

bool TemporaryFile::createHidden(ErrorSlot& error) {
  constexpr unsigned kEveryone = 0666;
  const unsigned mode = attributes_ ? S_IRUSR | S_IWUSR : kEveryone;
  int failure = EEXIST;
  for (int attempt = 0; attempt < kCreationAttempts && failure == EEXIST; ++attempt) {
    std::string name = hiddenName();
    if (name.empty()) {
      failure = errno;
      break;
    }
    const Registry::Hold hold;
    descriptor_ =
        FileDescriptor::openAt(directory_, name, O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW, mode);
    if (!descriptor_.isOpen()) {
      failure = errno;
      continue;
    }
    if (needsLock_ && !takeLock(name)) {
      ::unlinkat(directory_, name.c_str(), 0);
      descriptor_.close();
      continue;
    }
    hiddenName_ = std::move(name);
    Registry::add(*this, hold);
    return true;
  }
  error = posixError(failure);
  return false;
}

/// Until it is locked, a new file looks like one whose owner is dead, and may be removed as such:
/// then it is left to the remover (false), and another takes its place. In a directory that is
/// locked as a whole there is no remover.
bool TemporaryFile::takeLock(const std::string& name) {
  const bool taken = !lock(descriptor_.get()) && errno == EWOULDBLOCK;
  return !taken && isNamed(descriptor_.get(), directory_, name);
}

bool TemporaryFile::write(std::string_view bytes, ErrorSlot& error) {
  if (descriptor_.isOpen() && writeAll(descriptor_.get(), bytes)) return true;
  return fail(descriptor_.isOpen() ? errno : EBADF, error);
}

bool TemporaryFile::sync(ErrorSlot& error) {
  if (descriptor_.isOpen() && isSynced(&::fdatasync, descriptor_.get())) return true;
  return fail(descriptor_.isOpen() ? errno : EBADF, error);
}

/// Where the file system has none, it goes on without.
void TemporaryFile::applyAttributes() {
  if (!attributes_) return;
  ::fchmod(descriptor_.get(), attributes_->mode);
  if (attributes_->modified) {
    const std::array<timespec, 2> times = {timespec{0, UTIME_OMIT}, *attributes_->modified};
    ::futimens(descriptor_.get(), times.data());
  }
}

bool TemporaryFile::commitReplacing(ErrorSlot& error) {
  struct stat replaced {};
  const bool isReplacing = descriptor_.isOpen() && ::fstatat(directory_, name_.c_str(), &replaced,
                                                             AT_SYMLINK_NOFOLLOW) == 0;
  return (!isReplacing || sync(error)) && commit(&moveReplacing, error);
}

bool TemporaryFile::commitNew(ErrorSlot& error) {
  return commit(&moveNew, error);
}

bool TemporaryFile::commit(bool (*move)(int directory, const char* from, const char* to),
                           ErrorSlot& error) {
  if (!descriptor_.isOpen()) return fail(EBADF, error);
  applyAttributes();
  // The second descriptor keeps the lock until the file has its final name.
  FileDescriptor lockHolder;
  if (needsLock_) lockHolder = FileDescriptor(::fcntl(descriptor_.get(), F_DUPFD_CLOEXEC, 0));
  bool isDone = lockHolder.isOpen() == needsLock_ && descriptor_.close();
  int failure = errno;
  if (isDone) {
    const Registry::Hold hold;
    isDone = move(directory_, hiddenName_.c_str(), name_.c_str());
    failure = errno;
    if (isDone) {
      if (!isPart_) Registry::remove(*this, hold);
      hiddenName_.clear();
    }
  }
  return isDone || fail(failure, error);
}

void TemporaryFile::removeAllAndExit(int status) {
  const Registry::Hold hold;
  Registry::unlinkAll();
  ::_exit(status);
}

void TemporaryFile::discard() {
  descriptor_.close();
  if (isPart_) hiddenName_.clear();
  if (hiddenName_.empty()) return;
  const Registry::Hold hold;
  ::unlinkat(directory_, hiddenName_.c_str(), 0);
  Registry::remove(*this, hold);
  hiddenName_.clear();
}

bool isTemporaryFileName(std::string_view name) {
  if (name.size() != kNamePrefix.size() + 2 * kRandomBytes + kNameSuffix.size() ||
      !name.starts_with(kNamePrefix) || !name.ends_with(kNameSuffix)) {
    return false;
  }
  return name.substr(kNamePrefix.size(), 2 * kRandomBytes).find_first_not_of(kHexDigits) ==
         std::string_view::npos;
}

void removeStaleTemporaryFiles(Directory& directory) {
  if (!directory.isLocked() &&
      directory.lock(Directory::Wait::kNot) == Directory::Lock::kHeldByAnother) {
    return;
  }
  FileDescriptor listed(::fcntl(directory.descriptor(), F_DUPFD_CLOEXEC, 0));
  const std::unique_ptr<DIR, int (*)(DIR*)> entries(::fdopendir(listed.get()), &::closedir);
  if (!entries) return;
  listed.release();  // closed with the list
  ::rewinddir(entries.get());
  while (const dirent* entry = ::readdir(entries.get())) {
    const std::string name = entry->d_name;
    if (!isTemporaryFileName(name) || !directory.fileSize(name)) continue;
    constexpr int kFlags = O_NONBLOCK | O_NOFOLLOW;
    FileDescriptor file = FileDescriptor::openAt(directory.descriptor(), name, O_RDWR | kFlags);
    // A killed copy may be read-only already. A read-only descriptor can be locked except on NFS.
    if (!file.isOpen() && errno == EACCES) {
      file = FileDescriptor::openAt(directory.descriptor(), name, O_RDONLY | kFlags);
    }
    if (file.isOpen() && lock(file.get())) ::unlinkat(directory.descriptor(), name.c_str(), 0);
  }
}

}  // namespace platform
