#include "platform/files/TemporaryFile.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <filesystem>
#include <functional>
#include <thread>

#include "tests/support/ChildProcess.h"
#include "tests/support/InterposedCalls.h"
#include "tests/support/RefusedSystemCall.h"
#include "tests/support/TemporaryDirectory.h"

namespace platform {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::MatchesRegex;

constexpr const char* kHiddenNamePattern = "\\.qel-[0-9a-f]+\\.part";

class TemporaryFileTest : public testing::Test {
 protected:
  bool createWith(std::string_view content, const std::string& destination) {
    return file_.create(destination, error_) && file_.write(content, error_);
  }
  std::string description() const { return error_ ? error_->description : ""; }

  TemporaryDirectory directory_;
  TemporaryFile file_;
  ErrorSlot error_;
};

TEST_F(TemporaryFileTest, IsHiddenUntilCommitted) {
  ASSERT_TRUE(createWith("half", directory_ / "a.mp3"));
  EXPECT_GE(file_.descriptor(), 0);
  EXPECT_THAT(directory_.names(), ElementsAre(MatchesRegex(kHiddenNamePattern)));
  ASSERT_TRUE(file_.write(" and half", error_));
  ASSERT_TRUE(file_.commitReplacing(error_));
  EXPECT_EQ(file_.descriptor(), -1);
  EXPECT_THAT(directory_.names(), ElementsAre("a.mp3"));
  EXPECT_EQ(contentOf(directory_ / "a.mp3"), "half and half");
  EXPECT_EQ(error_, std::nullopt);
}

TEST_F(TemporaryFileTest, IsRemovedByItsDestructor) {
  {
    TemporaryFile file;
    ASSERT_TRUE(file.create(directory_ / "a.mp3", error_));
  }
  EXPECT_THAT(directory_.names(), IsEmpty());
}

TEST_F(TemporaryFileTest, SecondCreationRemovesTheFirstFile) {
  ASSERT_TRUE(createWith("first", directory_ / "a.mp3"));
  ASSERT_TRUE(createWith("second", directory_ / "b.mp3"));
  ASSERT_TRUE(file_.commitNew(error_));
  EXPECT_THAT(directory_.names(), ElementsAre("b.mp3"));
  EXPECT_EQ(contentOf(directory_ / "b.mp3"), "second");
}

TEST_F(TemporaryFileTest, FollowsTheUmask) {
  const mode_t previous = ::umask(027);
  const bool created = createWith("x", directory_ / "a.mp3") && file_.commitNew(error_);
  ::umask(previous);
  ASSERT_TRUE(created);
  struct stat status {};
  ASSERT_EQ(::stat((directory_ / "a.mp3").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777U, 0640U);
}

TEST_F(TemporaryFileTest, TakesFinalNamesOf255Bytes) {
  const std::string name(255, 'n');
  ASSERT_TRUE(createWith("x", directory_ / name));
  ASSERT_TRUE(file_.commitNew(error_));
  EXPECT_THAT(directory_.names(), ElementsAre(name));
}

TEST_F(TemporaryFileTest, TakesRelativePaths) {
  const std::filesystem::path previous = std::filesystem::current_path();
  std::filesystem::current_path(directory_.path());
  const bool done = createWith("x", "bare.mp3") && file_.commitNew(error_);
  std::filesystem::current_path(previous);
  EXPECT_TRUE(done);
  EXPECT_THAT(directory_.names(), ElementsAre("bare.mp3"));
}

TEST_F(TemporaryFileTest, CreationFailsWithTheCause) {
  const std::string plainFile = directory_.addFile("file", "");
  const std::array<std::pair<std::string, std::string>, 5> rows = {{
      {"", "No such file or directory"},
      {directory_ / "missing/a.mp3", "No such file or directory"},
      {plainFile + "/a.mp3", "Not a directory"},
      {directory_ / "a.mp3/", "Invalid argument"},
      {directory_ / std::string("a\0.mp3", 6), "Invalid argument"},
  }};
  for (const auto& [destination, expected] : rows) {
    SCOPED_TRACE(destination);
    ErrorSlot error;
    EXPECT_FALSE(file_.create(destination, error));
    ASSERT_TRUE(error);
    EXPECT_EQ(error->domain, "POSIX");
    EXPECT_EQ(error->description, expected);
    EXPECT_EQ(file_.descriptor(), -1);
  }
  EXPECT_THAT(directory_.names(), ElementsAre("file"));
}

TEST_F(TemporaryFileTest, CommitReplacingReplacesAFile) {
  directory_.addFile("a.mp3", "a longer old content");
  ASSERT_TRUE(createWith("new", directory_ / "a.mp3"));
  EXPECT_EQ(contentOf(directory_ / "a.mp3"), "a longer old content");
  ASSERT_TRUE(file_.commitReplacing(error_));
  EXPECT_EQ(contentOf(directory_ / "a.mp3"), "new");
  EXPECT_THAT(directory_.names(), ElementsAre("a.mp3"));
}

TEST_F(TemporaryFileTest, CommitReplacingReplacesALinkAndLeavesItsTarget) {
  const std::string target = directory_.addFile("target", "kept");
  std::filesystem::create_symlink(target, directory_ / "a.mp3");
  ASSERT_TRUE(createWith("new", directory_ / "a.mp3"));
  ASSERT_TRUE(file_.commitReplacing(error_));
  EXPECT_EQ(contentOf(target), "kept");
  EXPECT_FALSE(std::filesystem::is_symlink(directory_ / "a.mp3"));
  EXPECT_EQ(contentOf(directory_ / "a.mp3"), "new");
}

TEST_F(TemporaryFileTest, CommitReplacingNeverReplacesADirectory) {
  std::filesystem::create_directory(directory_ / "a.mp3");
  ASSERT_TRUE(createWith("new", directory_ / "a.mp3"));
  EXPECT_FALSE(file_.commitReplacing(error_));
  EXPECT_EQ(description(), "Is a directory");
  EXPECT_THAT(directory_.names(), ElementsAre("a.mp3"));
  EXPECT_TRUE(std::filesystem::is_directory(directory_ / "a.mp3"));
}

TEST_F(TemporaryFileTest, CommitNewRefusesWhateverExists) {
  directory_.addFile("file", "kept");
  std::filesystem::create_directory(directory_ / "directory");
  std::filesystem::create_symlink("nowhere", directory_ / "dangling");
  for (const char* name : {"file", "directory", "dangling"}) {
    SCOPED_TRACE(name);
    error_.reset();
    ASSERT_TRUE(createWith("new", directory_ / name));
    EXPECT_FALSE(file_.commitNew(error_));
    EXPECT_EQ(description(), "File exists");
    EXPECT_EQ(file_.descriptor(), -1);
  }
  EXPECT_THAT(directory_.names(), ElementsAre("dangling", "directory", "file"));
  EXPECT_EQ(contentOf(directory_ / "file"), "kept");
}

TEST_F(TemporaryFileTest, CommitNewDoesWithoutAnExclusiveRename) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  directory_.addFile("taken", "kept");
  for (const int refusal : {EINVAL, ENOSYS}) {
    const std::string name = "new" + std::to_string(refusal);
    EXPECT_EQ(exitStatusOfChild([&] {
                TemporaryFile file;
                ErrorSlot error;
                if (!refuseSystemCall(SYS_renameat2, refusal)) return 1;
                if (!file.create(directory_ / name, error) || !file.write("x", error) ||
                    !file.commitNew(error)) {
                  return 2;
                }
                if (!file.create(directory_ / "taken", error) || file.commitNew(error)) return 3;
                return error && error->description == "File exists" ? 0 : 4;
              }),
              0);
  }
  EXPECT_THAT(directory_.names(),
              ElementsAre("new" + std::to_string(EINVAL), "new" + std::to_string(ENOSYS), "taken"));
  EXPECT_EQ(contentOf(directory_ / "taken"), "kept");
}

TEST_F(TemporaryFileTest, DoesWithoutLocks) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  EXPECT_EQ(exitStatusOfChild([&] {
              TemporaryFile file;
              ErrorSlot error;
              if (!refuseSystemCall(SYS_flock, ENOLCK)) return 1;
              return file.create(directory_ / "a", error) && file.commitNew(error) ? 0 : 2;
            }),
            0);
  EXPECT_THAT(directory_.names(), ElementsAre("a"));
}

TEST_F(TemporaryFileTest, FailedCloseFailsTheCommit) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  directory_.addFile("a", "kept");
  EXPECT_EQ(exitStatusOfChild([&] {
              TemporaryFile file;
              ErrorSlot error;
              if (!file.create(directory_ / "a", error) || !refuseSystemCall(SYS_close, EIO)) {
                return 1;
              }
              if (file.commitReplacing(error) || !error) return 2;
              return error->description == "Input/output error" ? 0 : 3;
            }),
            0);
  EXPECT_THAT(directory_.names(), ElementsAre("a"));
  EXPECT_EQ(contentOf(directory_ / "a"), "kept");
}

/// Has hidden names be made of this byte alone.
int fillWith(unsigned char byte, void* buffer, std::size_t length) {
  std::memset(buffer, byte, length);
  return 0;
}

TEST_F(TemporaryFileTest, TriesAnotherNameForOneThatIsTaken) {
  directory_.addFile(".qel-0101010101010101.part", "kept");
  unsigned char byte = 0;
  const Interposed names(
      &InterposedCalls::getentropy,
      std::function([&](void* buffer, std::size_t n) { return fillWith(++byte, buffer, n); }));
  ASSERT_TRUE(createWith("x", directory_ / "a"));
  EXPECT_THAT(directory_.names(),
              ElementsAre(".qel-0101010101010101.part", ".qel-0202020202020202.part"));
  EXPECT_EQ(contentOf(directory_ / ".qel-0101010101010101.part"), "kept");
}

TEST_F(TemporaryFileTest, GivesUpWhenEveryNameIsTaken) {
  directory_.addFile(".qel-0707070707070707.part", "kept");
  int attempts = 0;
  const Interposed names(&InterposedCalls::getentropy,
                         std::function([&](void* buffer, std::size_t n) {
                           ++attempts;
                           return fillWith(7, buffer, n);
                         }));
  EXPECT_FALSE(file_.create(directory_ / "a", error_));
  EXPECT_EQ(description(), "File exists");
  EXPECT_EQ(attempts, 100);
  EXPECT_EQ(contentOf(directory_ / ".qel-0707070707070707.part"), "kept");
}

TEST_F(TemporaryFileTest, FailsWithoutRandomBytes) {
  const Interposed names(&InterposedCalls::getentropy, std::function([](void*, std::size_t) {
    errno = ENOSYS;
    return -1;
  }));
  EXPECT_FALSE(file_.create(directory_ / "a", error_));
  EXPECT_EQ(description(), "Function not implemented");
  EXPECT_THAT(directory_.names(), IsEmpty());
}

// Between the creation of a file and its lock, a remover can take it for stale.
TEST_F(TemporaryFileTest, TriesAgainWhenAnotherHasLockedTheFile) {
  FileDescriptor remover;
  std::string taken;
  const Interposed locks(&InterposedCalls::flock, std::function([&](int descriptor, int operation) {
    if (!remover.isOpen()) {
      taken = directory_.names().at(0);
      remover = FileDescriptor::open(directory_ / taken, O_RDWR);
      ::syscall(SYS_flock, remover.get(), LOCK_EX);
    }
    return static_cast<int>(::syscall(SYS_flock, descriptor, operation));
  }));
  ASSERT_TRUE(createWith("x", directory_ / "a"));
  ASSERT_EQ(directory_.names().size(), 1U);
  EXPECT_NE(directory_.names().at(0), taken);
  ASSERT_TRUE(file_.commitNew(error_)) << description();
  EXPECT_EQ(contentOf(directory_ / "a"), "x");
}

TEST_F(TemporaryFileTest, TriesAgainWhenAnotherHasRemovedTheFile) {
  std::string removed;
  const Interposed locks(&InterposedCalls::flock, std::function([&](int descriptor, int operation) {
    if (removed.empty()) {
      removed = directory_.names().at(0);
      ::unlink((directory_ / removed).c_str());
    }
    return static_cast<int>(::syscall(SYS_flock, descriptor, operation));
  }));
  ASSERT_TRUE(createWith("x", directory_ / "a"));
  ASSERT_EQ(directory_.names().size(), 1U);
  EXPECT_NE(directory_.names().at(0), removed);
  ASSERT_TRUE(file_.commitNew(error_)) << description();
  EXPECT_EQ(contentOf(directory_ / "a"), "x");
}

TEST_F(TemporaryFileTest, ShortWriteFailsAndRemovesTheFile) {
  EXPECT_EQ(
      exitStatusOfChild([&] {
        ::signal(SIGXFSZ, SIG_IGN);
        const rlimit limit{1000, 1000};
        ::setrlimit(RLIMIT_FSIZE, &limit);
        TemporaryFile file;
        ErrorSlot error;
        if (!file.create(directory_ / "a", error) || !file.write(std::string(600, 'x'), error)) {
          return 1;
        }
        if (file.write(std::string(600, 'x'), error) || !error ||
            error->description != "File too large") {
          return 2;
        }
        if (file.descriptor() != -1 || !directory_.names().empty()) return 3;
        error.reset();
        return !file.write("x", error) && error && !file.commitNew(error) ? 0 : 4;
      }),
      0);
  EXPECT_THAT(directory_.names(), IsEmpty());
}

TEST_F(TemporaryFileTest, UseBeforeCreationFails) {
  EXPECT_FALSE(file_.write("x", error_));
  EXPECT_EQ(description(), "Bad file descriptor");
  error_.reset();
  EXPECT_FALSE(file_.commitReplacing(error_));
  EXPECT_EQ(description(), "Bad file descriptor");
  error_.reset();
  EXPECT_FALSE(file_.commitNew(error_));
  EXPECT_EQ(description(), "Bad file descriptor");
}

TEST_F(TemporaryFileTest, EndingSignalsRemoveTheFilesAndTellThemselves) {
  directory_.addFile("done", "kept");
  for (const int signal : {SIGINT, SIGTERM, SIGHUP}) {
    SCOPED_TRACE(signal);
    const int status = statusOfChild([&] {
      ::signal(signal, SIG_DFL);
      TemporaryFile first;
      TemporaryFile second;
      TemporaryFile committed;
      ErrorSlot error;
      if (first.create(directory_ / "a", error) && second.create(directory_ / "b", error) &&
          committed.create(directory_ / "done", error) && committed.commitReplacing(error)) {
        ::raise(signal);
      }
      return 1;
    });
    EXPECT_TRUE(WIFSIGNALED(status));
    EXPECT_EQ(WTERMSIG(status), signal);
    EXPECT_THAT(directory_.names(), ElementsAre("done"));
  }
}

TEST_F(TemporaryFileTest, SignalOnAnotherThreadRemovesTheFiles) {
  const int status = statusOfChild([&] {
    TemporaryFile file;
    ErrorSlot error;
    if (file.create(directory_ / "a", error)) {
      std::thread([] { ::raise(SIGTERM); }).join();
    }
    return 1;
  });
  EXPECT_TRUE(WIFSIGNALED(status));
  EXPECT_EQ(WTERMSIG(status), SIGTERM);
  EXPECT_THAT(directory_.names(), IsEmpty());
}

// A child that creates and drops files without a pause is interrupted at some point or other.
TEST_F(TemporaryFileTest, SignalsAtAnyMomentLeaveNothing) {
  for (int round = 0; round < 50; ++round) {
    const pid_t child = ::fork();
    if (child == 0) {
      for (;;) {
        TemporaryFile file;
        ErrorSlot error;
        if (!file.create(directory_ / "a", error) || !file.write("x", error)) ::_exit(1);
        if (!file.commitReplacing(error)) ::_exit(2);
      }
    }
    while (!std::filesystem::exists(directory_ / "a")) std::this_thread::yield();
    ::usleep(static_cast<useconds_t>(round * 37));
    ::kill(child, SIGTERM);
    int status = 0;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    EXPECT_TRUE(WIFSIGNALED(status));
    EXPECT_THAT(directory_.names(), ElementsAre("a"));
    std::filesystem::remove(directory_ / "a");
  }
}

TEST_F(TemporaryFileTest, IgnoredSignalsStayIgnored) {
  for (const int signal : {SIGINT, SIGTERM, SIGHUP}) {
    SCOPED_TRACE(signal);
    EXPECT_EQ(exitStatusOfChild([&] {
                ::signal(signal, SIG_IGN);
                TemporaryFile file;
                ErrorSlot error;
                if (!file.create(directory_ / "a", error)) return 1;
                ::raise(signal);
                return file.commitNew(error) ? 0 : 2;
              }),
              0);
    EXPECT_THAT(directory_.names(), ElementsAre("a"));
    std::filesystem::remove(directory_ / "a");
  }
}

TEST_F(TemporaryFileTest, StaleFilesOfAKilledRunAreRemoved) {
  const int status = statusOfChild([&] {
    TemporaryFile file;
    ErrorSlot error;
    if (file.create(directory_ / "a", error)) ::raise(SIGKILL);
    return 1;
  });
  ASSERT_TRUE(WIFSIGNALED(status));
  ASSERT_THAT(directory_.names(), ElementsAre(MatchesRegex(kHiddenNamePattern)));
  removeStaleTemporaryFiles(directory_.path());
  EXPECT_THAT(directory_.names(), IsEmpty());
}

TEST_F(TemporaryFileTest, FilesInUseAreNotStale) {
  ASSERT_TRUE(createWith("x", directory_ / "a"));
  removeStaleTemporaryFiles(directory_.path());
  ASSERT_TRUE(file_.commitNew(error_)) << description();
  EXPECT_EQ(contentOf(directory_ / "a"), "x");
}

TEST_F(TemporaryFileTest, OnlyHiddenFilesOfOursAreStale) {
  const std::array<const char*, 9> others = {
      ".qel+0123456789abcdef.part", ".qel-0123456789abcdef.para",     ".qel-0123456789abcdef.par",
      ".qel-0123456789abcde.part",  ".qel-0123456789abcdeff.part",    ".qel-0123456789ABCDEF.part",
      "qel-0123456789abcdef.part",  ".qel-0123456789abcdef.part.mp3", "x.qel-0123456789abcdef.part",
  };
  for (const char* name : others) directory_.addFile(name, "kept");
  std::filesystem::create_directory(directory_ / ".qel-0000000000000001.part");
  std::filesystem::create_symlink("elsewhere", directory_ / ".qel-0000000000000002.part");
  ASSERT_EQ(::mkfifo((directory_ / ".qel-0000000000000003.part").c_str(), 0600), 0);
  const std::vector<std::string> before = directory_.names();
  directory_.addFile(".qel-0123456789abcdef.part", "stale");
  removeStaleTemporaryFiles(directory_.path());
  EXPECT_EQ(directory_.names(), before);
}

TEST_F(TemporaryFileTest, RemovalOfStaleFilesFromAMissingDirectoryDoesNothing) {
  removeStaleTemporaryFiles(directory_ / "missing");
  removeStaleTemporaryFiles(directory_.addFile("file", "kept"));
  EXPECT_EQ(contentOf(directory_ / "file"), "kept");
}

TEST_F(TemporaryFileTest, StaleFilesOfTheWorkingDirectoryAreRemoved) {
  directory_.addFile(".qel-0123456789abcdef.part", "stale");
  EXPECT_EQ(exitStatusOfChild([&] {
              std::filesystem::current_path(directory_.path());
              removeStaleTemporaryFiles("");
              return 0;
            }),
            0);
  EXPECT_THAT(directory_.names(), IsEmpty());
}

TEST_F(TemporaryFileTest, StaleFilesThatCannotBeOpenedStay) {
  directory_.addFile(".qel-0123456789abcdef.part", "stale");
  EXPECT_EQ(exitStatusOfChild([&] {
              // The directory takes the last descriptor that is to be had.
              const FileDescriptor next(::dup(STDIN_FILENO));
              const auto number = static_cast<rlim_t>(next.get());
              const rlimit limit{number + 2, number + 2};
              ::setrlimit(RLIMIT_NOFILE, &limit);
              removeStaleTemporaryFiles(directory_.path());
              return 0;
            }),
            0);
  EXPECT_THAT(directory_.names(), ElementsAre(".qel-0123456789abcdef.part"));
}

// The remover sees new files before their owner has locked them; the owner must notice.
TEST_F(TemporaryFileTest, NewFilesSurviveAConcurrentRemover) {
  const pid_t remover = ::fork();
  if (remover == 0) {
    for (;;) removeStaleTemporaryFiles(directory_.path());
  }
  int committed = 0;
  for (int round = 0; round < 3000; ++round) {
    TemporaryFile file;
    ErrorSlot error;
    if (file.create(directory_ / "a", error) && file.commitReplacing(error)) ++committed;
  }
  ::kill(remover, SIGKILL);
  ::waitpid(remover, nullptr, 0);
  EXPECT_EQ(committed, 3000);
  EXPECT_THAT(directory_.names(), ElementsAre("a"));
}

}  // namespace
}  // namespace platform
