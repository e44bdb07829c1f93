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

using testing::Each;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::MatchesRegex;
using testing::Ne;

constexpr const char* kHiddenNamePattern = "\\.qel-[0-9a-f]+\\.part";

class TemporaryFileTest : public testing::Test {
 protected:
  bool createWith(std::string_view content, const std::string& destination) {
    return file_.create(destination, error_) && file_.write(content, error_);
  }
  /// Whether a new file gets its final name by either commit.
  bool isCommitted(const std::string& destination, std::string_view content = "x") {
    return createWith(content, destination) && file_.commitNew(error_);
  }
  bool isReplaced(const std::string& destination, std::string_view content) {
    return createWith(content, destination) && file_.commitReplacing(error_);
  }
  void removeStale() {
    Directory directory = *Directory::open(directory_.path(), error_);
    removeStaleTemporaryFiles(directory);
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
  ASSERT_TRUE(TemporaryFile().create(directory_ / "a.mp3", error_));
  EXPECT_THAT(directory_.names(), IsEmpty());
}

TEST_F(TemporaryFileTest, SecondCreationRemovesTheFirstFile) {
  ASSERT_TRUE(createWith("first", directory_ / "a.mp3"));
  ASSERT_TRUE(isCommitted(directory_ / "b.mp3", "second"));
  EXPECT_THAT(directory_.names(), ElementsAre("b.mp3"));
  EXPECT_EQ(contentOf(directory_ / "b.mp3"), "second");
}

TEST_F(TemporaryFileTest, FollowsTheUmask) {
  const mode_t previous = ::umask(027);
  EXPECT_TRUE(isCommitted(directory_ / "a.mp3"));
  ::umask(previous);
  struct stat status {};
  ASSERT_EQ(::stat((directory_ / "a.mp3").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777U, 0640U);
}

TEST_F(TemporaryFileTest, TakesRelativePathsAndNamesOf255Bytes) {
  const std::string name(255, 'n');
  EXPECT_TRUE(holdsInChild([&] {
    std::filesystem::current_path(directory_.path());
    return isCommitted(name);
  }));
  EXPECT_THAT(directory_.names(), ElementsAre(name));
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
    EXPECT_FALSE(file_.create(destination, error_));
    EXPECT_EQ(description(), expected);
    EXPECT_EQ(file_.descriptor(), -1);
  }
  EXPECT_THAT(directory_.names(), ElementsAre("file"));
}

TEST_F(TemporaryFileTest, CommitReplacingReplacesFilesAndLinks) {
  const std::string target = directory_.addFile("target", "a longer old content");
  std::filesystem::create_symlink(target, directory_ / "link");
  ASSERT_TRUE(isReplaced(directory_ / "link", "of a link"));
  EXPECT_EQ(contentOf(target), "a longer old content");
  ASSERT_TRUE(isReplaced(target, "of a file"));
  EXPECT_EQ(contentOf(directory_ / "link"), "of a link");
  EXPECT_EQ(contentOf(target), "of a file");
  EXPECT_THAT(directory_.names(), ElementsAre("link", "target"));
}

TEST_F(TemporaryFileTest, CommitReplacingNeverReplacesADirectory) {
  std::filesystem::create_directory(directory_ / "a.mp3");
  EXPECT_FALSE(isReplaced(directory_ / "a.mp3", "new"));
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
    EXPECT_FALSE(isCommitted(directory_ / name));
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
    EXPECT_TRUE(holdsInChild([&] {
      return refuseSystemCall(SYS_renameat2, refusal) && isCommitted(directory_ / "new") &&
             !isCommitted(directory_ / "taken") && description() == "File exists";
    }));
    EXPECT_THAT(directory_.names(), ElementsAre("new", "taken"));
    std::filesystem::remove(directory_ / "new");
  }
  EXPECT_EQ(contentOf(directory_ / "taken"), "kept");
}

TEST_F(TemporaryFileTest, DoesWithoutLocks) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  EXPECT_TRUE(holdsInChild(
      [&] { return refuseSystemCall(SYS_flock, ENOLCK) && isCommitted(directory_ / "a"); }));
  EXPECT_THAT(directory_.names(), ElementsAre("a"));
}

TEST_F(TemporaryFileTest, FailedCloseFailsTheCommit) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  directory_.addFile("a", "kept");
  EXPECT_TRUE(holdsInChild([&] {
    return createWith("x", directory_ / "a") && refuseSystemCall(SYS_close, EIO) &&
           !file_.commitReplacing(error_) && description() == "Input/output error";
  }));
  EXPECT_THAT(directory_.names(), ElementsAre("a"));
  EXPECT_EQ(contentOf(directory_ / "a"), "kept");
}

/// Has hidden names be made of one byte, which the function gives.
Interposed<int(void*, std::size_t)> madeUpNames(std::function<unsigned char()> nextByte) {
  return {&InterposedCalls::getentropy,
          [nextByte = std::move(nextByte)](void* buffer, std::size_t length) {
            std::memset(buffer, nextByte(), length);
            return 0;
          }};
}

TEST_F(TemporaryFileTest, TriesAnotherNameForOneThatIsTaken) {
  const std::string taken = directory_.addFile(".qel-0101010101010101.part", "kept");
  unsigned char byte = 0;
  const auto names = madeUpNames([&] { return ++byte; });
  ASSERT_TRUE(createWith("x", directory_ / "a"));
  EXPECT_THAT(directory_.names(),
              ElementsAre(".qel-0101010101010101.part", ".qel-0202020202020202.part"));
  EXPECT_EQ(contentOf(taken), "kept");
}

TEST_F(TemporaryFileTest, GivesUpWhenEveryNameIsTaken) {
  const std::string taken = directory_.addFile(".qel-0707070707070707.part", "kept");
  int attempts = 0;
  const auto names = madeUpNames([&]() -> unsigned char { return ++attempts, 7; });
  EXPECT_FALSE(file_.create(directory_ / "a", error_));
  EXPECT_EQ(description(), "File exists");
  EXPECT_EQ(attempts, 100);
  EXPECT_EQ(contentOf(taken), "kept");
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
TEST_F(TemporaryFileTest, TriesAgainWhenAnotherHasLockedOrRemovedTheFile) {
  FileDescriptor remover;
  const std::array<std::function<void(const std::string&)>, 3> interferences = {
      [&](const std::string& path) {
        remover = FileDescriptor::open(path, O_RDWR);
        ::syscall(SYS_flock, remover.get(), LOCK_EX);
      },
      [](const std::string& path) { ::unlink(path.c_str()); },
      [](const std::string& path) { ::unlink(path.c_str()), std::ofstream(path) << "another"; }};
  for (const auto& interfere : interferences) {
    std::string taken;
    const Interposed locks(&InterposedCalls::flock,
                           std::function([&](int descriptor, int operation) {
                             if (taken.empty()) {
                               interfere(directory_ / (taken = directory_.names().at(0)));
                             }
                             return static_cast<int>(::syscall(SYS_flock, descriptor, operation));
                           }));
    ASSERT_TRUE(createWith("x", directory_ / "a"));
    EXPECT_THAT(directory_.names(), ElementsAre(Ne(taken)));
    ASSERT_TRUE(file_.commitNew(error_)) << description();
    EXPECT_EQ(contentOf(directory_ / "a"), "x");
    std::filesystem::remove(directory_ / "a");
  }
}

TEST_F(TemporaryFileTest, ShortWriteFailsAndRemovesTheFile) {
  EXPECT_TRUE(holdsInChild([&] {
    ::signal(SIGXFSZ, SIG_IGN);
    const rlimit limit{1000, 1000};
    ::setrlimit(RLIMIT_FSIZE, &limit);
    return createWith(std::string(600, 'x'), directory_ / "a") &&
           !file_.write(std::string(600, 'x'), error_) && description() == "File too large" &&
           file_.descriptor() == -1 && directory_.names().empty() && !file_.write("x", error_) &&
           !file_.commitNew(error_);
  }));
  EXPECT_THAT(directory_.names(), IsEmpty());
}

TEST_F(TemporaryFileTest, UseBeforeCreationFails) {
  const ErrorSlot expected = ErrorRecord{"POSIX", EBADF, "Bad file descriptor"};
  ErrorSlot ofWriting;
  ErrorSlot ofReplacing;
  ErrorSlot ofCommitting;
  EXPECT_FALSE(file_.write("x", ofWriting));
  EXPECT_FALSE(file_.commitReplacing(ofReplacing));
  EXPECT_FALSE(file_.commitNew(ofCommitting));
  EXPECT_THAT((std::array{ofWriting, ofReplacing, ofCommitting}), Each(expected));
}

TEST_F(TemporaryFileTest, EndingSignalsRemoveTheFilesAndTellThemselves) {
  for (const int signal : {SIGINT, SIGTERM, SIGHUP}) {
    SCOPED_TRACE(signal);
    const int status = statusOfChild([&] {
      if (const auto before = ::signal(signal, SIG_DFL); before != SIG_IGN) {
        ::signal(signal, before);
      }
      TemporaryFile second;
      TemporaryFile committed;
      return createWith("x", directory_ / "a") && second.create(directory_ / "b", error_) &&
                     committed.create(directory_ / "done", error_) &&
                     committed.commitReplacing(error_)
                 ? ::raise(signal)
                 : 1;
    });
    EXPECT_EQ(WTERMSIG(status), signal);
    EXPECT_THAT(directory_.names(), ElementsAre("done"));
  }
}

TEST_F(TemporaryFileTest, SignalOnAnotherThreadRemovesTheFiles) {
  const int status = statusOfChild([&] {
    if (createWith("x", directory_ / "a")) std::thread([] { ::raise(SIGTERM); }).join();
    return 1;
  });
  EXPECT_EQ(WTERMSIG(status), SIGTERM);
  EXPECT_THAT(directory_.names(), IsEmpty());
}

// A child that creates and drops files without a pause is interrupted at some point or other.
TEST_F(TemporaryFileTest, SignalsAtAnyMomentLeaveNothing) {
  for (int round = 0; round < 50; ++round) {
    const pid_t child = ::fork();
    if (child == 0) {
      while (isReplaced(directory_ / "a", "x")) continue;
      ::_exit(1);
    }
    while (!std::filesystem::exists(directory_ / "a")) std::this_thread::yield();
    ::usleep(static_cast<useconds_t>(round * 37));
    ::kill(child, SIGTERM);
    int status = 0;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    EXPECT_EQ(WTERMSIG(status), SIGTERM);
    EXPECT_THAT(directory_.names(), ElementsAre("a"));
    std::filesystem::remove(directory_ / "a");
  }
}

TEST_F(TemporaryFileTest, IgnoredSignalsStayIgnored) {
  for (const int signal : {SIGINT, SIGTERM, SIGHUP}) {
    SCOPED_TRACE(signal);
    EXPECT_TRUE(holdsInChild([&] {
      ::signal(signal, SIG_IGN);
      return createWith("x", directory_ / "a") && ::raise(signal) == 0 &&
             file_.commitReplacing(error_);
    }));
    EXPECT_THAT(directory_.names(), ElementsAre("a"));
  }
}

TEST_F(TemporaryFileTest, StaleFilesOfAKilledRunAreRemoved) {
  const int status =
      statusOfChild([&] { return createWith("x", directory_ / "a") ? ::raise(SIGKILL) : 1; });
  ASSERT_TRUE(WIFSIGNALED(status));
  ASSERT_THAT(directory_.names(), ElementsAre(MatchesRegex(kHiddenNamePattern)));
  removeStale();
  EXPECT_THAT(directory_.names(), IsEmpty());
}

TEST_F(TemporaryFileTest, FilesInUseAreNotStale) {
  ASSERT_TRUE(createWith("x", directory_ / "a"));
  removeStale();
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
  removeStale();
  Directory nowhere;
  removeStaleTemporaryFiles(nowhere);
  EXPECT_EQ(directory_.names(), before);
}

TEST_F(TemporaryFileTest, StaleFilesThatCannotBeOpenedStay) {
  directory_.addFile(".qel-0123456789abcdef.part", "stale");
  EXPECT_TRUE(holdsInChild([&] {
    std::optional<Directory> directory = Directory::open(directory_.path(), error_);
    // The list of the directory takes the last descriptor that is to be had.
    const FileDescriptor next(::dup(STDIN_FILENO));
    const rlim_t count = static_cast<rlim_t>(next.get()) + 2;
    const rlimit limit{count, count};
    ::setrlimit(RLIMIT_NOFILE, &limit);
    removeStaleTemporaryFiles(*directory);
    return true;
  }));
  EXPECT_THAT(directory_.names(), ElementsAre(".qel-0123456789abcdef.part"));
}

// The remover sees new files before their owner has locked them; the owner must notice.
TEST_F(TemporaryFileTest, NewFilesSurviveAConcurrentRemover) {
  const pid_t remover = ::fork();
  if (remover == 0) {
    for (;;) removeStale();
  }
  int committed = 0;
  while (committed < 3000 && isReplaced(directory_ / "a", "")) ++committed;
  ::kill(remover, SIGKILL);
  ::waitpid(remover, nullptr, 0);
  EXPECT_EQ(committed, 3000) << description();
  EXPECT_THAT(directory_.names(), ElementsAre("a"));
}

}  // namespace
}  // namespace platform
