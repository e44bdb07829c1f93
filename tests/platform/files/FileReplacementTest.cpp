#include "platform/files/FileReplacement.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <filesystem>
#include <thread>

#include "platform/files/Directory.h"
#include "platform/files/TemporaryFile.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/RefusedSystemCall.h"
#include "tests/support/TemporaryDirectory.h"

namespace platform {
namespace {

using testing::ElementsAre;

class FileReplacementTest : public testing::Test {
 protected:
  bool replaces(const std::string& path, std::string_view bytes = "new") {
    error_.reset();
    return replaceFile(path, bytes, error_);
  }
  std::string description() const { return error_ ? error_->description : ""; }

  TemporaryDirectory directory_;
  ErrorSlot error_;
};

TEST_F(FileReplacementTest, FilesAreMadeAndReplaced) {
  const std::string path = directory_ / "feed.xml";
  EXPECT_TRUE(replaces(path, "one"));
  EXPECT_EQ(contentOf(path), "one");
  EXPECT_TRUE(replaces(path, "two"));
  EXPECT_EQ(contentOf(path), "two");
  EXPECT_THAT(directory_.names(), ElementsAre("feed.xml"));
}

TEST_F(FileReplacementTest, WhoReadsTheOldFileKeepsIt) {
  const std::string path = directory_.addFile("feed.xml", "old");
  std::ifstream reader(path);
  EXPECT_TRUE(replaces(path));
  EXPECT_EQ(std::string(std::istreambuf_iterator<char>(reader), {}), "old");
  EXPECT_EQ(contentOf(path), "new");
}

TEST_F(FileReplacementTest, PermissionsAreHandedOn) {
  const std::string path = directory_.addFile("feed.xml", "old");
  ::chmod(path.c_str(), 0604);
  EXPECT_TRUE(replaces(path));
  EXPECT_EQ(std::filesystem::status(path).permissions(), std::filesystem::perms(0604));
}

// Whoever fills the directory as a bundle has it locked as a whole, and not each file.
TEST_F(FileReplacementTest, LeavesWhatARunInTheSameDirectoryStillWrites) {
  Directory bundle = *Directory::open(directory_.path(), error_);
  ASSERT_EQ(bundle.lock(Directory::Wait::kForever), Directory::Lock::kTaken);
  TemporaryFile file;
  ASSERT_TRUE(file.create({bundle, "one.mp3"}, error_));
  EXPECT_TRUE(replaces(directory_ / "feed.xml"));
  EXPECT_TRUE(file.commitNew(error_));
  EXPECT_THAT(directory_.names(), ElementsAre("feed.xml", "one.mp3"));
}

TEST_F(FileReplacementTest, RemovesWhatAKilledRunLeft) {
  directory_.addFile(".qel-0123456789abcdef.part", "stale");
  EXPECT_TRUE(replaces(directory_ / "feed.xml"));
  EXPECT_THAT(directory_.names(), ElementsAre("feed.xml"));
}

TEST_F(FileReplacementTest, LinksAreWrittenThrough) {
  std::filesystem::create_directory(directory_ / "real");
  directory_.addFile("real/feed.xml", "old");
  std::filesystem::create_symlink("feed.xml", directory_ / "real/link.xml");
  std::filesystem::create_symlink("real/link.xml", directory_ / "link.xml");
  EXPECT_TRUE(replaces(directory_ / "link.xml"));
  EXPECT_EQ(contentOf(directory_ / "real/feed.xml"), "new");
  EXPECT_TRUE(std::filesystem::is_symlink(directory_ / "link.xml"));
  EXPECT_TRUE(std::filesystem::is_symlink(directory_ / "real/link.xml"));

  std::filesystem::create_symlink(directory_ / "absent.xml", directory_ / "dangling.xml");
  EXPECT_TRUE(replaces(directory_ / "dangling.xml"));
  EXPECT_EQ(contentOf(directory_ / "absent.xml"), "new");

  std::filesystem::create_symlink("loop.xml", directory_ / "loop.xml");
  EXPECT_FALSE(replaces(directory_ / "loop.xml"));
  EXPECT_EQ(description(), "Too many levels of symbolic links");
}

TEST_F(FileReplacementTest, FIFOsAreWrittenThemselves) {
  const std::string path = directory_ / "fifo";
  ASSERT_EQ(::mkfifo(path.c_str(), 0600), 0);
  std::string read;
  std::thread reader([&] { read = contentOf(path); });
  EXPECT_TRUE(replaces(path));
  reader.join();
  EXPECT_EQ(read, "new");
  EXPECT_TRUE(std::filesystem::is_fifo(path));
}

TEST_F(FileReplacementTest, DescriptorsAreWrittenThemselves) {
  const std::string path = directory_.addFile("log", "old");
  const int descriptor = ::open(path.c_str(), O_WRONLY);
  ASSERT_GE(descriptor, 0);
  struct stat before {};
  ::fstat(descriptor, &before);
  for (const std::string folder : {"/dev/fd/", "/proc/self/fd/"}) {
    EXPECT_TRUE(replaces(folder + std::to_string(descriptor), folder));
    struct stat after {};
    ASSERT_EQ(::stat(path.c_str(), &after), 0);
    EXPECT_EQ(before.st_ino, after.st_ino);
    EXPECT_EQ(contentOf(path), folder);
  }
  EXPECT_TRUE(holdsInChild(
      [&] { return ::dup2(descriptor, STDERR_FILENO) >= 0 && replaces("/dev/stderr", "error"); }));
  EXPECT_EQ(contentOf(path), "error");
  struct stat after {};
  ASSERT_EQ(::stat(path.c_str(), &after), 0);
  EXPECT_EQ(before.st_ino, after.st_ino);
  ::close(descriptor);
}

TEST_F(FileReplacementTest, StandardOutputIsAppendedTo) {
  for (const char* name : {"-", "/dev/stdout"}) {
    const std::string path = directory_.addFile("out", "old ");
    EXPECT_TRUE(holdsInChild([&] {
      const int descriptor = ::open(path.c_str(), O_WRONLY | O_APPEND);
      return ::dup2(descriptor, STDOUT_FILENO) == STDOUT_FILENO && replaces(name);
    }));
    EXPECT_EQ(contentOf(path), "old new") << name;
  }
}

TEST_F(FileReplacementTest, FailuresLeaveTheOldFile) {
  const std::string path = directory_.addFile("feed.xml", "old");
  EXPECT_TRUE(holdsInChild([&] {
    std::signal(SIGXFSZ, SIG_IGN);
    const rlimit limit{2, 2};
    ::setrlimit(RLIMIT_FSIZE, &limit);
    return !replaces(path, "longer") && description() == "File too large";
  }));
  EXPECT_EQ(contentOf(path), "old");
  EXPECT_THAT(directory_.names(), ElementsAre("feed.xml"));
}

TEST_F(FileReplacementTest, StandardOutputThatTakesNoMoreIsAFailure) {
  EXPECT_TRUE(holdsInChild([&] {
    const int full = ::open("/dev/full", O_WRONLY);
    return ::dup2(full, STDOUT_FILENO) >= 0 && !replaces("-") &&
           description() == "No space left on device";
  }));
}

TEST_F(FileReplacementTest, FailedCloseOfADeviceIsAFailure) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  EXPECT_TRUE(holdsInChild([&] {
    return refuseSystemCall(SYS_close, EIO) && !replaces("/dev/null") &&
           description() == "Input/output error";
  }));
}

TEST_F(FileReplacementTest, WhatCannotBeWrittenIsAFailure) {
  EXPECT_FALSE(replaces("/dev/full"));
  EXPECT_EQ(description(), "No space left on device");
  EXPECT_FALSE(replaces(directory_.path()));
  EXPECT_EQ(description(), "Is a directory");
  EXPECT_FALSE(replaces(directory_ / "missing/feed.xml"));
  EXPECT_EQ(description(), "No such file or directory");
  EXPECT_FALSE(replaces(""));
  EXPECT_EQ(description(), "No such file or directory");
  EXPECT_FALSE(replaces(std::string("a\0b", 3)));
  EXPECT_EQ(description(), "Invalid argument");
}

}  // namespace
}  // namespace platform
