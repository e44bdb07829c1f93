#include "platform/files/Directory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <filesystem>
#include <utility>

#include "platform/files/TemporaryFile.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/InterposedCalls.h"
#include "tests/support/RefusedSystemCall.h"
#include "tests/support/TemporaryDirectory.h"

namespace platform {
namespace {

using testing::ElementsAre;

class DirectoryTest : public testing::Test {
 protected:
  Directory opened(const std::string& path) {
    auto directory = Directory::open(path, error_);
    EXPECT_TRUE(directory) << path << ": " << description();
    return directory ? std::move(*directory) : Directory();
  }
  /// Whether a file that is made in the directory is to be found under the path.
  bool leadsTo(std::optional<Directory> directory, const std::string& path) {
    TemporaryFile file;
    return directory && file.create({*directory, "mark"}, error_) && file.commitNew(error_) &&
           std::filesystem::remove(path + "/mark");
  }
  std::string description() const { return error_ ? error_->description : ""; }

  TemporaryDirectory root_;
  ErrorSlot error_;
};

TEST_F(DirectoryTest, FollowsLinksToWhereItIsOpened) {
  std::filesystem::create_directory(root_ / "a");
  std::filesystem::create_symlink("a", root_ / "link");
  EXPECT_TRUE(leadsTo(opened(root_ / "link"), root_ / "a"));
}

TEST_F(DirectoryTest, OpeningFailsWithTheCause) {
  root_.addFile("file", "");
  for (const auto& [path, expected] : {std::pair{root_ / "missing", "No such file or directory"},
                                       std::pair{root_ / "file", "Not a directory"},
                                       std::pair{std::string(), "No such file or directory"}}) {
    EXPECT_FALSE(Directory::open(path, error_));
    EXPECT_EQ(description(), expected) << path;
  }
}

TEST_F(DirectoryTest, StaysWhereItIsWhateverHappensToItsPath) {
  std::filesystem::create_directory(root_ / "a");
  std::filesystem::create_directory(root_ / "elsewhere");
  Directory directory = opened(root_ / "a");
  std::filesystem::rename(root_ / "a", root_ / "moved");
  std::filesystem::create_symlink("elsewhere", root_ / "a");
  EXPECT_TRUE(leadsTo(std::move(directory), root_ / "moved"));
}

TEST_F(DirectoryTest, OpensWhatIsBelowAndMakesWhatIsMissing) {
  const Directory directory = opened(root_.path());
  EXPECT_TRUE(leadsTo(directory.openOrMake("new", error_), root_ / "new"));
  EXPECT_TRUE(leadsTo(directory.openOrMake("new", error_), root_ / "new"));
  EXPECT_EQ(error_, std::nullopt);
}

TEST_F(DirectoryTest, FollowsLinksThatStayInside) {
  std::filesystem::create_directories(root_ / "bundle/art/deep");
  std::filesystem::create_symlink("bundle/art", root_ / "outer");
  const Directory directory = opened(root_ / "bundle");
  for (const auto& [target, place] : {std::pair<std::string, std::string>{"art", "bundle/art"},
                                      {"art/deep", "bundle/art/deep"},
                                      {".", "bundle"},
                                      {root_ / "bundle/art", "bundle/art"},
                                      {"../bundle/art", "bundle/art"},
                                      {"../outer", "bundle/art"}}) {
    SCOPED_TRACE(target);
    std::filesystem::create_symlink(target, root_ / "bundle/link");
    EXPECT_TRUE(leadsTo(directory.openOrMake("link", error_), root_ / place)) << description();
    std::filesystem::remove(root_ / "bundle/link");
  }
}

TEST_F(DirectoryTest, FollowsNoLinkThatLeadsOut) {
  std::filesystem::create_directories(root_ / "bundle/art");
  std::filesystem::create_directories(root_ / "bundle-2");
  const Directory directory = opened(root_ / "bundle");
  for (const std::string& target :
       {std::string(".."), std::string("../bundle-2"), std::string("art/../../bundle-2"),
        std::string("/"), root_.path(), root_ / "bundle-2", std::string("/proc/self")}) {
    SCOPED_TRACE(target);
    std::filesystem::create_symlink(target, root_ / "bundle/link");
    error_.reset();
    EXPECT_FALSE(directory.openOrMake("link", error_));
    EXPECT_EQ(description(), "The link leads out of the directory");
    std::filesystem::remove(root_ / "bundle/link");
  }
}

TEST_F(DirectoryTest, WhatIsNoDirectoryIsNotOpened) {
  root_.addFile("file", "");
  std::filesystem::create_symlink("nowhere", root_ / "dangling");
  std::filesystem::create_symlink("loop", root_ / "loop");
  ASSERT_EQ(::mkfifo((root_ / "fifo").c_str(), 0600), 0);
  const Directory directory = opened(root_.path());
  for (const auto& [name, expected] : {std::pair{"file", "Not a directory"},
                                       {"fifo", "Not a directory"},
                                       {"dangling", "File exists"},
                                       {"loop", "Too many levels of symbolic links"},
                                       {"", "Invalid argument"},
                                       {".", "Invalid argument"},
                                       {"..", "Invalid argument"},
                                       {"a/b", "Invalid argument"}}) {
    SCOPED_TRACE(name);
    EXPECT_FALSE(directory.openOrMake(name, error_));
    EXPECT_EQ(description(), expected);
  }
  EXPECT_FALSE(directory.openOrMake(std::string("a\0b", 3), error_));
  EXPECT_FALSE(std::filesystem::exists(root_ / "nowhere"));
}

TEST_F(DirectoryTest, LooksAtWhatIsUnderANameAndNotBehindIt) {
  root_.addFile("file", "four");
  std::filesystem::create_directory(root_ / "directory");
  std::filesystem::create_symlink("file", root_ / "link");
  std::filesystem::create_symlink("nowhere", root_ / "dangling");
  ::chmod((root_ / "file").c_str(), 04750);
  const Directory directory = opened(root_.path());
  for (const char* name : {"file", "directory", "link", "dangling"}) {
    EXPECT_TRUE(directory.contains(name)) << name;
    EXPECT_EQ(directory.containsLink(name),
              name == std::string("link") || name == std::string("dangling"));
    EXPECT_EQ(directory.fileSize(name).has_value(), name == std::string("file")) << name;
    EXPECT_EQ(directory.attributesForSuccessor(name).has_value(), name == std::string("file"));
  }
  EXPECT_EQ(directory.fileSize("file"), 4U);
  EXPECT_EQ(directory.attributesForSuccessor("file")->mode, 0750U);
  EXPECT_FALSE(directory.attributesForSuccessor("file")->modified);
  for (const char* name : {"missing", "", ".", "..", "directory/../file"}) {
    EXPECT_FALSE(directory.contains(name)) << name;
    EXPECT_FALSE(directory.containsLink(name)) << name;
    EXPECT_FALSE(directory.fileSize(name)) << name;
  }
}

TEST_F(DirectoryTest, TwoNamesOfOneFileHaveOneIdentity) {
  std::filesystem::create_hard_link(root_.addFile("a", ""), root_ / "A");
  root_.addFile("b", "");
  const Directory directory = opened(root_.path());
  EXPECT_EQ(directory.identity("a"), directory.identity("A"));
  EXPECT_NE(directory.identity("a"), directory.identity("b"));
}

TEST_F(DirectoryTest, RemovesFilesAndLinks) {
  root_.addFile("file", "");
  std::filesystem::create_symlink("file", root_ / "link");
  std::filesystem::create_directory(root_ / "directory");
  const Directory directory = opened(root_.path());
  EXPECT_TRUE(directory.remove("link", error_));
  EXPECT_THAT(root_.names(), ElementsAre("directory", "file"));
  EXPECT_TRUE(directory.remove("file", error_));
  EXPECT_EQ(error_, std::nullopt);
  EXPECT_FALSE(directory.remove("file", error_));
  EXPECT_EQ(description(), "No such file or directory");
  EXPECT_FALSE(directory.remove("directory", error_));
  EXPECT_EQ(description(), "Is a directory");
  EXPECT_FALSE(directory.remove("directory/../x", error_));
  EXPECT_EQ(description(), "Invalid argument");
}

TEST_F(DirectoryTest, OpenNowhereHoldsNothingAndTakesNothing) {
  Directory nowhere;
  EXPECT_FALSE(nowhere.isOpen());
  EXPECT_FALSE(nowhere.contains("tmp"));
  EXPECT_FALSE(nowhere.openOrMake("x", error_));
  EXPECT_EQ(description(), "Bad file descriptor");
  EXPECT_FALSE(TemporaryFile().create({nowhere, "x"}, error_));
  EXPECT_EQ(description(), "Bad file descriptor");
  EXPECT_FALSE(nowhere.sync(error_));
  EXPECT_FALSE(nowhere.syncFileSystem(error_));
  EXPECT_EQ(nowhere.lock(Directory::Wait::kForever), Directory::Lock::kNotToBeHad);
}

TEST_F(DirectoryTest, OneAtATimeHoldsTheLock) {
  Directory second = opened(root_.path());
  {
    Directory first = opened(root_.path());
    EXPECT_EQ(first.lock(Directory::Wait::kForever), Directory::Lock::kTaken);
    EXPECT_TRUE(first.isLocked());
    EXPECT_EQ(second.lock(Directory::Wait::kNot), Directory::Lock::kHeldByAnother);
    EXPECT_FALSE(second.isLocked());
  }
  EXPECT_EQ(second.lock(Directory::Wait::kNot), Directory::Lock::kTaken);
}

TEST_F(DirectoryTest, TheKernelReleasesTheLockOfAProcessThatIsKilled) {
  const int status = statusOfChild([&] {
    return opened(root_.path()).lock(Directory::Wait::kForever) == Directory::Lock::kTaken
               ? ::raise(SIGKILL)
               : 1;
  });
  EXPECT_EQ(WTERMSIG(status), SIGKILL);
  EXPECT_EQ(opened(root_.path()).lock(Directory::Wait::kNot), Directory::Lock::kTaken);
}

TEST_F(DirectoryTest, WaitsForTheLockThroughSignals) {
  Directory directory = opened(root_.path());
  int calls = 0;
  const Interposed locks(&InterposedCalls::flock, std::function([&](int, int operation) {
    EXPECT_EQ(operation, LOCK_EX);
    if (++calls == 3) return 0;
    errno = EINTR;
    return -1;
  }));
  EXPECT_EQ(directory.lock(Directory::Wait::kForever), Directory::Lock::kTaken);
  EXPECT_EQ(calls, 3);
}

TEST_F(DirectoryTest, DirectoriesOfEveryoneAreNotLocked) {
  for (const auto& [mode, expected] : {std::pair{01777, Directory::Lock::kNotToBeHad},
                                       {01002, Directory::Lock::kNotToBeHad},
                                       {0777, Directory::Lock::kTaken},
                                       {01775, Directory::Lock::kTaken}}) {
    std::filesystem::create_directory(root_ / "a");
    Directory directory = opened(root_ / "a");
    ::chmod((root_ / "a").c_str(), static_cast<mode_t>(mode));
    EXPECT_EQ(directory.lock(Directory::Wait::kForever), expected) << mode;
    std::filesystem::remove(root_ / "a");
  }
}

// A neighbour may have made it, to have files put where he wants them.
TEST_F(DirectoryTest, TakesNothingOfStrangersInDirectoriesOfEveryone) {
  std::filesystem::create_directories(root_ / "tmp/art");
  std::filesystem::create_symlink("art", root_ / "tmp/link");
  const Directory directory = opened(root_ / "tmp");
  EXPECT_TRUE(directory.openOrMake("link", error_));
  ::chmod((root_ / "tmp").c_str(), 01777);
  EXPECT_FALSE(directory.openOrMake("link", error_));
  EXPECT_EQ(description(), "Not a directory of one's own");
  EXPECT_TRUE(leadsTo(directory.openOrMake("art", error_), root_ / "tmp/art"));
  EXPECT_TRUE(leadsTo(directory.openOrMake("new", error_), root_ / "tmp/new"));
  if (::chown((root_ / "tmp/art").c_str(), 65534, 65534) != 0) GTEST_SKIP() << "root is needed";
  EXPECT_FALSE(directory.openOrMake("art", error_));
  EXPECT_EQ(description(), "Not a directory of one's own");
  EXPECT_TRUE(holdsInChild([&] {
    ::chmod(root_.path().c_str(), 0755);
    return ::seteuid(65534) == 0 && directory.openOrMake("art", error_) &&
           directory.openOrMake("new", error_);
  }));
  ::chmod((root_ / "tmp").c_str(), 0777);
  EXPECT_TRUE(directory.openOrMake("art", error_));
}

TEST_F(DirectoryTest, SuccessorsTakeNothingOverFromStrangersButPrivacy) {
  ::chmod(root_.addFile("file", "").c_str(), 0640);
  const Directory directory = opened(root_.path());
  const auto attributes = directory.attributesForSuccessor("file");
  ASSERT_TRUE(attributes);
  EXPECT_EQ(attributes->mode, 0640U);
  if (::chown((root_ / "file").c_str(), 65534, 65534) != 0) GTEST_SKIP() << "root is needed";
  const auto ofStranger = directory.attributesForSuccessor("file");
  ASSERT_TRUE(ofStranger);
  EXPECT_EQ(ofStranger->mode, 0600U);
  ::chmod((root_ / "file").c_str(), 0666);
  EXPECT_FALSE(directory.attributesForSuccessor("file"));
}

TEST_F(DirectoryTest, KnowsWhetherAPathStillLeadsToIt) {
  std::filesystem::create_directory(root_ / "a");
  std::filesystem::create_symlink("a", root_ / "link");
  const Directory directory = opened(root_ / "link");
  EXPECT_TRUE(directory.isAt(root_ / "a"));
  EXPECT_TRUE(directory.isAt(root_ / "link"));
  EXPECT_FALSE(directory.isAt(root_ / std::string("a\0b", 3)));
  std::filesystem::rename(root_ / "a", root_ / "moved");
  EXPECT_FALSE(directory.isAt(root_ / "link"));
  std::filesystem::create_directory(root_ / "a");
  EXPECT_FALSE(directory.isAt(root_ / "link"));
  EXPECT_FALSE(Directory().isAt(root_ / "nowhere"));
}

TEST_F(DirectoryTest, DoesWithoutLocks) {
  Directory directory = opened(root_.path());
  const Interposed locks(&InterposedCalls::flock, std::function([](int, int) {
    errno = ENOLCK;
    return -1;
  }));
  EXPECT_EQ(directory.lock(Directory::Wait::kForever), Directory::Lock::kNotToBeHad);
  EXPECT_FALSE(directory.isLocked());
}

// What may be entered and not read cannot be locked, listed or told to the disk by itself.
TEST_F(DirectoryTest, DoesWithoutTheRightToRead) {
  std::filesystem::create_directory(root_ / "a");
  ::chmod((root_ / "a").c_str(), 0333);
  ::chmod(root_.path().c_str(), 0755);
  EXPECT_TRUE(holdsInChild([&] {
    if (::geteuid() == 0 && ::seteuid(65534) != 0) return false;
    if (::chmod((root_ / "a").c_str(), 0333) != 0 && ::geteuid() != 65534) return false;
    Directory directory = opened(root_ / "a");
    removeStaleTemporaryFiles(directory);
    TemporaryFile file;
    return directory.lock(Directory::Wait::kForever) == Directory::Lock::kNotToBeHad &&
           file.create({directory, "x"}, error_) && file.commitNew(error_) &&
           directory.fileSize("x") == 0U && directory.openOrMake("sub", error_) &&
           directory.syncFileSystem(error_) && directory.sync(error_);
  })) << description();
  ::chmod((root_ / "a").c_str(), 0755);
  EXPECT_TRUE(std::filesystem::exists(root_ / "a/x"));
}

TEST_F(DirectoryTest, SyncingFailsWithTheCauseAndGoesOnWhereThereIsNothingToTell) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  EXPECT_TRUE(opened(root_.path()).sync(error_));
  EXPECT_TRUE(opened(root_.path()).syncFileSystem(error_));
  for (const auto& [refusal, expected] : {std::pair{EIO, "Input/output error"},
                                          {ENOSPC, "No space left on device"},
                                          {EINVAL, ""},
                                          {ENOSYS, ""},
                                          {EOPNOTSUPP, ""}}) {
    SCOPED_TRACE(refusal);
    for (const long call : {SYS_fsync, SYS_syncfs}) {
      EXPECT_TRUE(holdsInChild([&, refusal = refusal, expected = expected] {
        const Directory directory = opened(root_.path());
        if (!refuseSystemCall(call, refusal)) return false;
        const bool isSynced =
            call == SYS_fsync ? directory.sync(error_) : directory.syncFileSystem(error_);
        return isSynced == std::string(expected).empty() && description() == expected;
      }));
    }
  }
}

TEST_F(DirectoryTest, KnowsItsFileSystem) {
  std::filesystem::create_directory(root_ / "a");
  const Directory directory = opened(root_.path());
  EXPECT_TRUE(opened(root_ / "a").isOnFileSystemOf(directory));
  EXPECT_FALSE(opened("/proc").isOnFileSystemOf(directory));
  EXPECT_FALSE(Directory().isOnFileSystemOf(directory));
}

}  // namespace
}  // namespace platform
