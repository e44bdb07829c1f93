#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <filesystem>
#include <functional>
#include <string>
#include <string_view>

#include "platform/files/TemporaryFile.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/InterposedCalls.h"
#include "tests/support/RefusedSystemCall.h"
#include "tests/support/TemporaryDirectory.h"

namespace platform {
namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

/// Files that are made in an open directory.
class TemporaryFileInDirectoryTest : public testing::Test {
 protected:
  TemporaryFileInDirectoryTest() { open_ = *Directory::open(directory_.path(), error_); }

  bool createWith(std::string_view content, const std::string& name,
                  const std::optional<FileAttributes>& attributes = std::nullopt) {
    return file_.create({open_, name}, error_, attributes) && file_.write(content, error_);
  }
  bool isCommitted(const std::string& name) {
    return createWith("new", name) && file_.commitNew(error_);
  }
  struct stat statusOf(const std::string& name) const {
    struct stat status {};
    EXPECT_EQ(::lstat((directory_ / name).c_str(), &status), 0) << name;
    return status;
  }
  std::string description() const { return error_ ? error_->description : ""; }

  TemporaryDirectory directory_;
  ErrorSlot error_;
  Directory open_;
  TemporaryFile file_;
};

TEST_F(TemporaryFileInDirectoryTest, NamesAreOfAllDigits) {
  std::string evenDigits;
  std::string oddDigits;
  for (int i = 0; i < 200; ++i) {
    ASSERT_TRUE(file_.create({open_, "x"}, error_));
    const std::string name = directory_.names().front();
    constexpr std::size_t kPrefix = std::string_view(".qel-").size();
    for (std::size_t at = kPrefix; name[at] != '.'; at += 2) {
      evenDigits += name[at];
      oddDigits += name[at + 1];
    }
  }
  for (const char digit : std::string_view("0123456789abcdef")) {
    EXPECT_THAT(evenDigits, Contains(digit));
    EXPECT_THAT(oddDigits, Contains(digit));
  }
}

TEST_F(TemporaryFileInDirectoryTest, StandsInTheDirectoryWhateverItsPathHasBecome) {
  std::filesystem::create_directory(directory_ / "a");
  std::filesystem::create_directory(directory_ / "elsewhere");
  const Directory inner = *Directory::open(directory_ / "a", error_);
  ASSERT_TRUE(file_.create({inner, "x"}, error_));
  std::filesystem::rename(directory_ / "a", directory_ / "moved");
  std::filesystem::create_symlink("elsewhere", directory_ / "a");
  EXPECT_TRUE(file_.commitNew(error_));
  EXPECT_TRUE(std::filesystem::exists(directory_ / "moved/x"));
  EXPECT_TRUE(std::filesystem::is_empty(directory_ / "elsewhere"));
}

TEST_F(TemporaryFileInDirectoryTest, TakesNoNameThatIsAPath) {
  for (const std::string& name : {std::string("a/b"), std::string("../b"), std::string(".."),
                                  std::string("."), std::string("/b"), std::string("a\0b", 3)}) {
    EXPECT_FALSE(file_.create({open_, name}, error_));
    EXPECT_EQ(description(), "Invalid argument") << name;
  }
  EXPECT_FALSE(file_.create({open_, ""}, error_));
  EXPECT_EQ(description(), "No such file or directory");
  EXPECT_THAT(directory_.names(), IsEmpty());
}

TEST_F(TemporaryFileInDirectoryTest, GetsTheAttributesWithItsNameAndIsPrivateBefore) {
  const mode_t previous = ::umask(077);
  for (const unsigned mode : {0644U, 0600U, 0444U, 0777U, 0U}) {
    ASSERT_TRUE(createWith("x", "a", FileAttributes{mode, timespec{1234567890, 987654321}}));
    EXPECT_EQ(statusOf(directory_.names().at(0)).st_mode & 07777U, 0600U);
    ASSERT_TRUE(file_.commitNew(error_));
    EXPECT_EQ(statusOf("a").st_mode & 07777U, mode);
    EXPECT_EQ(statusOf("a").st_mtim.tv_sec, 1234567890);
    EXPECT_EQ(statusOf("a").st_mtim.tv_nsec, 987654321);
    std::filesystem::remove(directory_ / "a");
  }
  ::umask(previous);
  // Without a time it has that of its making.
  ASSERT_TRUE(createWith("x", "a", FileAttributes{0640, std::nullopt}));
  ASSERT_TRUE(file_.commitNew(error_));
  EXPECT_GT(statusOf("a").st_mtim.tv_sec, 1234567890);
}

TEST_F(TemporaryFileInDirectoryTest, GoesOnWhereAttributesAreNotToBeHad) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  EXPECT_TRUE(holdsInChild([&] {
    return refuseSystemCall(SYS_fchmod, EPERM) && refuseSystemCall(SYS_utimensat, EPERM) &&
           createWith("x", "a", FileAttributes{0644, timespec{1, 0}}) && file_.commitNew(error_);
  }));
  EXPECT_EQ(statusOf("a").st_mode & 07777U, 0600U);
}

TEST_F(TemporaryFileInDirectoryTest, WhatReplacesAFileIsOnTheDiskBefore) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  directory_.addFile("old", "kept");
  EXPECT_TRUE(holdsInChild([&] {
    return refuseSystemCall(SYS_fdatasync, EIO) && createWith("x", "old") &&
           !file_.commitReplacing(error_) && description() == "Input/output error" &&
           createWith("x", "new") && file_.commitReplacing(error_);
  }));
  EXPECT_EQ(contentOf(directory_ / "old"), "kept");
  EXPECT_THAT(directory_.names(), ElementsAre("new", "old"));
}

TEST_F(TemporaryFileInDirectoryTest, FailedSyncRemovesTheFile) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  EXPECT_FALSE(file_.sync(error_));
  EXPECT_EQ(description(), "Bad file descriptor");
  EXPECT_TRUE(createWith("x", "a") && file_.sync(error_) && file_.commitNew(error_));
  EXPECT_TRUE(holdsInChild([&] {
    return refuseSystemCall(SYS_fdatasync, ENOSPC) && createWith("x", "b") && !file_.sync(error_) &&
           description() == "No space left on device" && file_.descriptor() == -1;
  }));
  EXPECT_THAT(directory_.names(), ElementsAre("a"));
}

// As on exFAT through a driver of user space.
TEST_F(TemporaryFileInDirectoryTest, CommitNewDoesWithoutLinks) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  directory_.addFile("taken", "kept");
  for (const int refusal : {EPERM, EOPNOTSUPP, ENOSYS}) {
    EXPECT_TRUE(holdsInChild([&] {
      return refuseSystemCall(SYS_renameat2, EINVAL) && refuseSystemCall(SYS_linkat, refusal) &&
             isCommitted("new") && !isCommitted("taken") && description() == "File exists";
    }));
    EXPECT_THAT(directory_.names(), ElementsAre("new", "taken"));
    EXPECT_EQ(contentOf(directory_ / "new"), "new");
    std::filesystem::remove(directory_ / "new");
  }
  EXPECT_EQ(contentOf(directory_ / "taken"), "kept");
}

TEST_F(TemporaryFileInDirectoryTest, NameThatWasHeldIsFreeAgainAfterAFailure) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  EXPECT_TRUE(holdsInChild([&] {
    return createWith("x", "new") && refuseSystemCall(SYS_renameat2, EINVAL) &&
           refuseSystemCall(SYS_linkat, EPERM) && refuseSystemCall(SYS_renameat, EIO) &&
           !file_.commitNew(error_) && description() == "Input/output error";
  }));
  EXPECT_THAT(directory_.names(), IsEmpty());
}

TEST_F(TemporaryFileInDirectoryTest, NameThatIsHeldGetsItsFileBeforeASignalIsHeard) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  const int status = statusOfChild([&] {
    const Interposed signals(
        &InterposedCalls::renameat,
        std::function([&](int directory, const char* from, const char* to) {
          ::raise(SIGTERM);
          return static_cast<int>(::syscall(SYS_renameat, directory, from, directory, to));
        }));
    refuseSystemCall(SYS_renameat2, EINVAL);
    refuseSystemCall(SYS_linkat, EPERM);
    return isCommitted("new") ? 0 : 1;
  });
  EXPECT_EQ(WTERMSIG(status), SIGTERM);
  EXPECT_THAT(directory_.names(), ElementsAre("new"));
  EXPECT_EQ(contentOf(directory_ / "new"), "new");
}

// Where the directory as a whole is locked, its files need no locks of their own.
TEST_F(TemporaryFileInDirectoryTest, LocksItselfOnlyWhereTheDirectoryIsNotLocked) {
  int fileLocks = 0;
  const Interposed locks(&InterposedCalls::flock, std::function([&](int descriptor, int operation) {
    if (operation == (LOCK_EX | LOCK_NB)) ++fileLocks;
    return static_cast<int>(::syscall(SYS_flock, descriptor, operation));
  }));
  EXPECT_TRUE(isCommitted("unlocked"));
  EXPECT_EQ(fileLocks, 1);
  ASSERT_EQ(open_.lock(Directory::Wait::kForever), Directory::Lock::kTaken);
  EXPECT_TRUE(isCommitted("locked"));
  EXPECT_EQ(fileLocks, 1);
}

TEST_F(TemporaryFileInDirectoryTest, StaleFilesAreFoundTwice) {
  for (int time = 0; time < 2; ++time) {
    directory_.addFile(".qel-0123456789abcdef.part", "stale");
    removeStaleTemporaryFiles(open_);
    EXPECT_THAT(directory_.names(), IsEmpty());
  }
}

// One that was killed right after it had got the permissions of its original.
TEST_F(TemporaryFileInDirectoryTest, StaleFilesThatMayOnlyBeReadAreRemoved) {
  const std::string stale = directory_.addFile(".qel-0123456789abcdef.part", "stale");
  ::chmod(stale.c_str(), 0444);
  ::chmod(directory_.path().c_str(), 0777);
  EXPECT_TRUE(holdsInChild([&] {
    if (::geteuid() == 0 && (::chown(stale.c_str(), 65534, 65534) != 0 || ::seteuid(65534) != 0)) {
      return false;
    }
    removeStaleTemporaryFiles(open_);
    return true;
  }));
  EXPECT_THAT(directory_.names(), IsEmpty());
}

/// Whether the signal, by itself, ends a process without being about a fault of its own.
bool endsFromOutside(int signal) {
  const std::array kOthers = {SIGABRT, SIGBUS,   SIGFPE,  SIGILL,  SIGSEGV, SIGSYS,
                              SIGTRAP, SIGCHLD,  SIGCONT, SIGTSTP, SIGTTIN, SIGTTOU,
                              SIGURG,  SIGWINCH, SIGKILL, SIGSTOP, SIGPIPE, SIGXFSZ};
  const bool isOfTheLibrary = signal > SIGSYS && signal < SIGRTMIN;
  return !isOfTheLibrary && std::find(kOthers.begin(), kOthers.end(), signal) == kOthers.end();
}

TEST_F(TemporaryFileInDirectoryTest, EverySignalThatEndsTheProcessRemovesTheFiles) {
  int count = 0;
  for (int signal = 1; signal <= SIGRTMAX; ++signal) {
    if (!endsFromOutside(signal)) continue;
    SCOPED_TRACE(signal);
    ++count;
    const int status = statusOfChild([&] {
      // Ignored, as under nohup, it would stay so; a handler may be there from before.
      if (const auto before = ::signal(signal, SIG_DFL); before != SIG_IGN) {
        ::signal(signal, before);
      }
      return createWith("x", "a") ? ::raise(signal) : 1;
    });
    EXPECT_TRUE(WIFSIGNALED(status));
    EXPECT_EQ(WTERMSIG(status), signal);
    EXPECT_THAT(directory_.names(), IsEmpty());
  }
  EXPECT_GE(count, 13 + SIGRTMAX - SIGRTMIN);
}

TEST_F(TemporaryFileInDirectoryTest, SignalsThatWereIgnoredStayIgnored) {
  for (const int signal : {SIGQUIT, SIGUSR1, SIGALRM}) {
    EXPECT_TRUE(holdsInChild([&] {
      ::signal(signal, SIG_IGN);
      return createWith("x", "a") && ::raise(signal) == 0 && file_.commitReplacing(error_);
    })) << signal;
  }
  EXPECT_THAT(directory_.names(), SizeIs(1));
}

}  // namespace
}  // namespace platform
