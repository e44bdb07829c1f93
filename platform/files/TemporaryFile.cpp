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

constexpr std::array kEndingSignals = {SIGINT, SIGTERM, SIGHUP};

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

bool isNamed(int descriptor, const std::string& path) {
  struct stat open {};
  struct stat named {};
  return ::fstat(descriptor, &open) == 0 && ::lstat(path.c_str(), &named) == 0 &&
         open.st_dev == named.st_dev && open.st_ino == named.st_ino;
}

int moveNew(const char* from, const char* to) {
  if (::renameat2(AT_FDCWD, from, AT_FDCWD, to, RENAME_NOREPLACE) == 0) return 0;
  if (errno != EINVAL && errno != ENOSYS) return -1;
  // Some file systems (NFS) cannot rename that way. A link is refused for an existing name, too.
  if (::link(from, to) != 0) return -1;
  ::unlink(from);
  return 0;
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
      sigset_t signals;
      ::sigemptyset(&signals);
      for (const int signal : kEndingSignals) ::sigaddset(&signals, signal);
      ::pthread_sigmask(SIG_BLOCK, &signals, &previous_);
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
    struct sigaction action {};
    action.sa_handler = &Registry::removeAllAndEnd;
    for (const int signal : kEndingSignals) ::sigaddset(&action.sa_mask, signal);
    for (const int signal : kEndingSignals) {
      struct sigaction current {};
      ::sigaction(signal, nullptr, &current);
      if (current.sa_handler == SIG_DFL) ::sigaction(signal, &action, nullptr);
    }
  }

  static void add(TemporaryFile& file, const Hold&) { file.next_ = std::exchange(first_, &file); }

  /// The file has been added and not been removed since.
  static void remove(TemporaryFile& file) {
    const Hold hold;
    TemporaryFile** link = &first_;
    while (*link != &file) link = &(*link)->next_;
    *link = std::exchange(file.next_, nullptr);
  }

  /// Only while the list is held.
  static void unlinkAll() {
    for (const TemporaryFile* file = first_; file != nullptr; file = file->next_) {
      ::unlink(file->path_.c_str());
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

bool TemporaryFile::create(const std::string& destination, ErrorSlot& error) {
  discard();
  const std::string directory = destination.substr(0, destination.rfind('/') + 1);
  if (destination.size() == directory.size() || destination.find('\0') != std::string::npos) {
    error = posixError(destination.empty() ? ENOENT : EINVAL);
    return false;
  }
  destination_ = destination;
  Registry::handleSignals();
  int failure = EEXIST;
  for (int attempt = 0; attempt < kCreationAttempts && failure == EEXIST; ++attempt) {
    const std::string name = hiddenName();
    if (name.empty()) {
      failure = errno;
      break;
    }
    std::string path = directory + name;
    const Registry::Hold hold;
    FileDescriptor file =
        FileDescriptor::open(path, O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW, 0666);
    if (!file.isOpen()) {
      failure = errno;
      continue;
    }
    // Until it is locked, the file looks like one whose owner is dead, and may be removed as such:
    // then it is left to the remover, and another takes its place.
    const bool taken = !lock(file.get()) && errno == EWOULDBLOCK;
    if (taken || !isNamed(file.get(), path)) {
      ::unlink(path.c_str());
      continue;
    }
    descriptor_ = std::move(file);
    path_ = std::move(path);
    Registry::add(*this, hold);
    return true;
  }
  error = posixError(failure);
  return false;
}

bool TemporaryFile::write(std::string_view bytes, ErrorSlot& error) {
  if (descriptor_.isOpen() && writeAll(descriptor_.get(), bytes)) return true;
  error = posixError(descriptor_.isOpen() ? errno : EBADF);
  discard();
  return false;
}

bool TemporaryFile::commitReplacing(ErrorSlot& error) {
  return commit(&::rename, error);
}

bool TemporaryFile::commitNew(ErrorSlot& error) {
  return commit(&moveNew, error);
}

bool TemporaryFile::commit(int (*move)(const char* from, const char* to), ErrorSlot& error) {
  // The second descriptor keeps the lock until the file has its final name.
  const FileDescriptor lockHolder(::fcntl(descriptor_.get(), F_DUPFD_CLOEXEC, 0));
  if (!lockHolder.isOpen() || !descriptor_.close() ||
      move(path_.c_str(), destination_.c_str()) != 0) {
    error = posixError(errno);
    discard();
    return false;
  }
  Registry::remove(*this);
  path_.clear();
  return true;
}

void TemporaryFile::removeAllAndExit(int status) {
  const Registry::Hold hold;
  Registry::unlinkAll();
  ::_exit(status);
}

void TemporaryFile::discard() {
  if (path_.empty()) return;
  ::unlink(path_.c_str());
  descriptor_.close();
  Registry::remove(*this);
  path_.clear();
}

bool isTemporaryFileName(std::string_view name) {
  if (name.size() != kNamePrefix.size() + 2 * kRandomBytes + kNameSuffix.size() ||
      !name.starts_with(kNamePrefix) || !name.ends_with(kNameSuffix)) {
    return false;
  }
  return name.substr(kNamePrefix.size(), 2 * kRandomBytes).find_first_not_of(kHexDigits) ==
         std::string_view::npos;
}

void removeStaleTemporaryFiles(const std::string& directory) {
  const std::string parent = directory.empty() ? "." : directory;
  const std::unique_ptr<DIR, int (*)(DIR*)> entries(::opendir(parent.c_str()), &::closedir);
  if (!entries) return;
  while (const dirent* entry = ::readdir(entries.get())) {
    const std::string_view name = entry->d_name;
    if (!isTemporaryFileName(name)) continue;
    const std::string path = std::string(parent).append("/").append(name);
    struct stat status {};
    if (::lstat(path.c_str(), &status) != 0 || !S_ISREG(status.st_mode)) continue;
    const FileDescriptor file = FileDescriptor::open(path, O_RDWR | O_NONBLOCK | O_NOFOLLOW);
    if (file.isOpen() && lock(file.get())) ::unlink(path.c_str());
  }
}

}  // namespace platform
