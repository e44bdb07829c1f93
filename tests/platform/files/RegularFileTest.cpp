#include "platform/files/RegularFile.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <filesystem>
#include <functional>
#include <string>

#include "tests/support/ChildProcess.h"
#include "tests/support/InterposedCalls.h"
#include "tests/support/RefusedSystemCall.h"
#include "tests/support/TemporaryDirectory.h"

namespace platform {
namespace {

class RegularFileTest : public testing::Test {
 protected:
  /// The error of opening a file in whose place `exchange` puts something else once it was looked
  /// at.
  ErrorSlot errorAfter(const std::function<void(const char*)>& exchange) {
    const std::string path = directory_.addFile("file", "content");
    const Interposed others(&InterposedCalls::stat,
                            std::function([&](const char* looked, struct stat* status) {
                              const int result = ::fstatat(AT_FDCWD, looked, status, 0);
                              ::unlink(looked);
                              exchange(looked);
                              return result;
                            }));
    ErrorSlot error;
    EXPECT_FALSE(RegularFile::open(path, error));
    return error;
  }

  TemporaryDirectory directory_;
};

TEST_F(RegularFileTest, ReadsPieceByPiece) {
  ErrorSlot error;
  auto file = RegularFile::open(directory_.addFile("file", "abcde"), error);
  ASSERT_TRUE(file);
  EXPECT_EQ(file->size(), 5U);
  std::array<char, 3> buffer{};
  EXPECT_EQ(file->read(buffer, error), 3U);
  EXPECT_EQ(std::string(buffer.data(), 3), "abc");
  EXPECT_EQ(file->read(buffer, error), 2U);
  EXPECT_EQ(std::string(buffer.data(), 2), "de");
  EXPECT_EQ(file->read(buffer, error), 0U);
  EXPECT_EQ(error, std::nullopt);
}

TEST_F(RegularFileTest, WhatTakesItsPlaceIsRefused) {
  EXPECT_EQ(errorAfter([](const char*) {}),
            (ErrorRecord{"POSIX", ENOENT, "No such file or directory"}));
  EXPECT_EQ(errorAfter([](const char* path) { ::mkfifo(path, 0600); }),
            (ErrorRecord{"POSIX", EINVAL, "Not a regular file"}));
  std::filesystem::remove(directory_ / "file");
  EXPECT_EQ(errorAfter([](const char* path) { ::mkdir(path, 0700); }),
            (ErrorRecord{"POSIX", EISDIR, "Is a directory"}));
}

TEST_F(RegularFileTest, WhatTheKernelMakesUpIsRefused) {
  const std::string link = directory_ / "link";
  std::filesystem::create_symlink("/proc/self/environ", link);
  for (const std::string& path :
       {std::string("/proc/self/environ"), std::string("/proc/version"), link}) {
    ErrorSlot error;
    EXPECT_FALSE(RegularFile::open(path, error));
    EXPECT_EQ(error, (ErrorRecord{"POSIX", EINVAL, "Not a stored file"})) << path;
  }
}

TEST_F(RegularFileTest, LinksOfTheKernelLeadToStoredFiles) {
  const FileDescriptor opened =
      FileDescriptor::open(directory_.addFile("file", "content"), O_RDONLY);
  ErrorSlot error;
  const auto file = RegularFile::open("/proc/self/fd/" + std::to_string(opened.get()), error);
  ASSERT_TRUE(file);
  EXPECT_EQ(file->size(), 7U);
}

TEST_F(RegularFileTest, NothingIsWaitedFor) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  ErrorSlot error;
  auto file = RegularFile::open(directory_.addFile("file", "content"), error);
  ASSERT_TRUE(file);
  EXPECT_TRUE(holdsInChild([&] {
    ::alarm(10);
    std::array<char, 3> buffer{};
    return refuseSystemCall(SYS_read, EAGAIN) && !file->read(buffer, error) &&
           error == ErrorRecord{"POSIX", EAGAIN, "Resource temporarily unavailable"};
  }));
}

TEST_F(RegularFileTest, FileThatCannotBeLookedAtIsRefused) {
  const Interposed device(&InterposedCalls::fstat, std::function([](int, struct stat*) {
    errno = EIO;
    return -1;
  }));
  ErrorSlot error;
  EXPECT_FALSE(RegularFile::open(directory_.addFile("file", "content"), error));
  EXPECT_EQ(error, (ErrorRecord{"POSIX", EIO, "Input/output error"}));
}

TEST_F(RegularFileTest, FileWhoseFileSystemIsNotToldIsRefused) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  const std::string path = directory_.addFile("file", "content");
  EXPECT_TRUE(holdsInChild([&] {
    ErrorSlot error;
    return refuseSystemCall(SYS_fstatfs, ENOSYS) && !RegularFile::open(path, error) &&
           error == ErrorRecord{"POSIX", ENOSYS, "Function not implemented"};
  }));
}

}  // namespace
}  // namespace platform
