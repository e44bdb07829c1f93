#include "platform/files/FileManager.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/un.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <filesystem>
#include <functional>
#include <utility>
#include <vector>

#include "platform/files/FileDescriptor.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/InterposedCalls.h"
#include "tests/support/RefusedSystemCall.h"
#include "tests/support/TemporaryDirectory.h"

namespace platform {
namespace {

using testing::ElementsAre;

/// Every byte value, in an order that a misplaced piece would break.
std::string largeContent(std::size_t size) {
  std::string content(size, '\0');
  for (std::size_t index = 0; index < size; ++index) {
    content[index] = static_cast<char>((index * 31 + index / 251) & 0xFFU);
  }
  return content;
}

/// As of a file system that tells no sizes.
int statusWithoutSize(int descriptor, struct stat* status) {
  const int result = ::fstatat(descriptor, "", status, AT_EMPTY_PATH);
  status->st_size = 0;
  return result;
}

class FileManagerTest : public testing::Test {
 protected:
  /// The paths of a FIFO, a socket and a device: all that is neither file nor directory.
  std::vector<std::string> specialFiles() {
    const std::string fifo = directory_ / "fifo";
    EXPECT_EQ(::mkfifo(fifo.c_str(), 0600), 0);
    const std::string path = directory_ / "socket";
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    EXPECT_LT(path.size(), sizeof address.sun_path);
    path.copy(address.sun_path, path.size());
    const FileDescriptor socket(::socket(AF_UNIX, SOCK_STREAM, 0));
    EXPECT_EQ(::bind(socket.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    return {fifo, path, "/dev/null", "/dev/zero"};
  }

  TemporaryDirectory directory_;
  ErrorSlot error_;
};

TEST_F(FileManagerTest, FileExistsFollowsLinks) {
  directory_.addFile("file", "");
  std::filesystem::create_symlink("file", directory_ / "link");
  std::filesystem::create_symlink("nowhere", directory_ / "dangling");
  EXPECT_TRUE(fileExists(directory_ / "file"));
  EXPECT_TRUE(fileExists(directory_.path()));
  EXPECT_TRUE(fileExists(directory_.path() + "/"));
  EXPECT_TRUE(fileExists(directory_ / "link"));
  EXPECT_FALSE(fileExists(directory_ / "dangling"));
  EXPECT_FALSE(fileExists(directory_ / "missing"));
  EXPECT_FALSE(fileExists(directory_ / "file/"));
  EXPECT_FALSE(fileExists(""));
  EXPECT_FALSE(fileExists(directory_ / std::string("file\0x", 6)));
}

/// What openWholeFile gives, read.
std::optional<std::string> wholeFile(const std::string& path, ErrorSlot& error) {
  std::optional<ByteSource> file = openWholeFile(path, error);
  return file ? file->readAll(error) : std::nullopt;
}

TEST_F(FileManagerTest, ReadsFilesOfAnySizeWhole) {
  for (const std::size_t size : {0U, 1U, 65535U, 65536U, 65537U, 3000000U}) {
    SCOPED_TRACE(size);
    const std::string content = largeContent(size);
    EXPECT_EQ(wholeFile(directory_.addFile("file", content), error_), content);
    EXPECT_EQ(error_, std::nullopt);
  }
}

TEST_F(FileManagerTest, ReadsFilesThatClaimToBeEmpty) {
  const Interposed sizes(&InterposedCalls::fstat, std::function(&statusWithoutSize));
  const std::string content = largeContent(100000);
  EXPECT_EQ(wholeFile(directory_.addFile("file", content), error_), content);
}

TEST_F(FileManagerTest, FailedReadsTellTheCause) {
  const std::string file = directory_.addFile("file", "x");
  std::vector<std::pair<std::string, ErrorRecord>> rows = {
      {"", {"POSIX", ENOENT, "No such file or directory"}},
      {directory_ / "missing", {"POSIX", ENOENT, "No such file or directory"}},
      {file + "/x", {"POSIX", ENOTDIR, "Not a directory"}},
      {directory_.path(), {"POSIX", EISDIR, "Is a directory"}},
      {directory_ / std::string(256, 'n'), {"POSIX", ENAMETOOLONG, "File name too long"}},
      {directory_ / std::string("file\0x", 6), {"POSIX", EINVAL, "Invalid argument"}},
  };
  for (const std::string& path : specialFiles()) {
    rows.push_back({path, {"POSIX", EINVAL, "Not a regular file"}});
  }
  for (const auto& [path, expected] : rows) {
    SCOPED_TRACE(path);
    ErrorSlot error;
    EXPECT_EQ(wholeFile(path, error), std::nullopt);
    EXPECT_EQ(error, expected);
  }
}

TEST_F(FileManagerTest, FilesOverTheLimitAreNotRead) {
  const std::string path = directory_.addFile("file", "");
  std::filesystem::resize_file(path, kWholeReadLimit + 1);
  EXPECT_EQ(wholeFile(path, error_), std::nullopt);
  EXPECT_EQ(error_, (ErrorRecord{"POSIX", EFBIG, "The file is larger than 2 GiB"}));
}

TEST_F(FileManagerTest, FilesThatTurnOutToBeOverTheLimitAreNotReadAnyFurther) {
  const Interposed sizes(&InterposedCalls::fstat, std::function(&statusWithoutSize));
  const std::string path = directory_.addFile("file", "");
  std::vector<char> room(std::size_t{64} << 20U);
  for (const bool isOver : {false, true}) {
    std::filesystem::resize_file(path, kWholeReadLimit + (isOver ? 1 : 0));
    std::optional<ByteSource> file = openWholeFile(path, error_);
    ASSERT_TRUE(file);
    std::size_t size = 0;
    std::optional<std::size_t> count;
    while ((count = file->read(room, error_)).value_or(0) > 0) size += *count;
    EXPECT_EQ(count.has_value(), !isOver);
    EXPECT_EQ(size, kWholeReadLimit);
  }
  EXPECT_EQ(error_, (ErrorRecord{"POSIX", EFBIG, "The file is larger than 2 GiB"}));
}

TEST_F(FileManagerTest, CreatesAllMissingDirectories) {
  for (const char* path : {"a", "b/c/d", "e/", "f//g///", "./h", "i/../j", "k/."}) {
    SCOPED_TRACE(path);
    EXPECT_TRUE(createDirectories(directory_ / path, error_));
    EXPECT_TRUE(std::filesystem::is_directory(directory_ / path));
    EXPECT_TRUE(createDirectories(directory_ / path, error_)) << "a second time";
  }
  EXPECT_EQ(error_, std::nullopt);
  EXPECT_TRUE(createDirectories("/", error_));
  EXPECT_TRUE(createDirectories(".", error_));
}

TEST_F(FileManagerTest, CreatesDirectoriesBehindLinksAndRelativePaths) {
  std::filesystem::create_directory(directory_ / "real");
  std::filesystem::create_symlink("real", directory_ / "link");
  EXPECT_TRUE(createDirectories(directory_ / "link", error_));
  EXPECT_TRUE(createDirectories(directory_ / "link/sub", error_));
  EXPECT_TRUE(std::filesystem::is_directory(directory_ / "real/sub"));

  const std::filesystem::path previous = std::filesystem::current_path();
  std::filesystem::current_path(directory_.path());
  EXPECT_TRUE(createDirectories("relative/sub", error_));
  std::filesystem::current_path(previous);
  EXPECT_TRUE(std::filesystem::is_directory(directory_ / "relative/sub"));
}

TEST_F(FileManagerTest, DirectoriesThatCannotBeMadeTellTheCause) {
  directory_.addFile("file", "kept");
  std::filesystem::create_symlink("nowhere", directory_ / "dangling");
  const std::array<std::pair<std::string, ErrorRecord>, 7> rows = {{
      {"", {"POSIX", ENOENT, "No such file or directory"}},
      {directory_ / "file", {"POSIX", EEXIST, "File exists"}},
      {directory_ / "file/", {"POSIX", EEXIST, "File exists"}},
      {directory_ / "file/sub", {"POSIX", ENOTDIR, "Not a directory"}},
      {directory_ / "dangling", {"POSIX", EEXIST, "File exists"}},
      {directory_ / std::string(256, 'n'), {"POSIX", ENAMETOOLONG, "File name too long"}},
      {directory_ / std::string("a\0b", 3), {"POSIX", EINVAL, "Invalid argument"}},
  }};
  for (const auto& [path, expected] : rows) {
    SCOPED_TRACE(path);
    ErrorSlot error;
    EXPECT_FALSE(createDirectories(path, error));
    EXPECT_EQ(error, expected);
  }
  EXPECT_FALSE(createDirectories("/proc/qel-no-such-place/x", error_));
  EXPECT_THAT(directory_.names(), ElementsAre("dangling", "file"));
}

TEST_F(FileManagerTest, CopiesFilesOfAnySize) {
  for (const std::size_t size : {0U, 1U, 131072U, 131073U, 3000000U}) {
    SCOPED_TRACE(size);
    const std::string content = largeContent(size);
    const std::string source = directory_.addFile("source", content);
    const std::string copy = directory_ / ("copy" + std::to_string(size));
    EXPECT_TRUE(copyFile(source, copy));
    EXPECT_EQ(contentOf(copy), content);
    EXPECT_EQ(contentOf(source), content);
  }
}

TEST_F(FileManagerTest, CopiesThroughLinksAndFilesThatClaimToBeEmpty) {
  directory_.addFile("source", "content");
  std::filesystem::create_symlink("source", directory_ / "link");
  EXPECT_TRUE(copyFile(directory_ / "link", directory_ / "copy"));
  EXPECT_FALSE(std::filesystem::is_symlink(directory_ / "copy"));
  EXPECT_EQ(contentOf(directory_ / "copy"), "content");

  const Interposed sizes(&InterposedCalls::fstat, std::function(&statusWithoutSize));
  EXPECT_TRUE(copyFile(directory_ / "source", directory_ / "whole"));
  EXPECT_EQ(contentOf(directory_ / "whole"), "content");
}

TEST_F(FileManagerTest, CopiesWhereTheKernelDoesNotHelp) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  const std::string content = largeContent(300000);
  const std::string source = directory_.addFile("source", content);
  for (const int refusal : {EXDEV, EINVAL, ENOSYS, EOPNOTSUPP, EPERM}) {
    SCOPED_TRACE(refusal);
    const std::string copy = directory_ / ("copy" + std::to_string(refusal));
    EXPECT_TRUE(holdsInChild(
        [&] { return refuseSystemCall(SYS_copy_file_range, refusal) && copyFile(source, copy); }));
    EXPECT_EQ(contentOf(copy), content);
  }
}

TEST_F(FileManagerTest, CopyGoesOnAfterASignal) {
  int calls = 0;
  const Interposed signals(&InterposedCalls::copy_file_range, std::function([&](std::size_t) {
    errno = ++calls == 1 ? EINTR : EXDEV;
    return ssize_t{-1};
  }));
  EXPECT_TRUE(copyFile(directory_.addFile("source", "content"), directory_ / "copy"));
  EXPECT_EQ(calls, 2);
  EXPECT_EQ(contentOf(directory_ / "copy"), "content");
}

TEST_F(FileManagerTest, CopyLeavesAloneWhatAppearsMeanwhile) {
  const Interposed others(&InterposedCalls::copy_file_range, std::function([&](std::size_t) {
    directory_.addFile("copy", "of another process");
    return ssize_t{0};
  }));
  EXPECT_FALSE(copyFile(directory_.addFile("source", "content"), directory_ / "copy"));
  EXPECT_EQ(contentOf(directory_ / "copy"), "of another process");
  EXPECT_THAT(directory_.names(), ElementsAre("copy", "source"));
}

TEST_F(FileManagerTest, CopyHasThePermissionsAndTheTimeOfItsOriginal) {
  const std::string source = directory_.addFile("source", "content");
  const std::array<timespec, 2> times = {timespec{5, 0}, timespec{1234567890, 123456789}};
  ::utimensat(AT_FDCWD, source.c_str(), times.data(), 0);
  for (const mode_t mode : {0644U, 0600U, 04755U, 0400U}) {
    ::chmod(source.c_str(), mode);
    EXPECT_TRUE(copyFile(source, directory_ / "copy"));
    struct stat status {};
    EXPECT_EQ(::stat((directory_ / "copy").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777U, mode & 0777U);
    EXPECT_EQ(status.st_mtim.tv_sec, 1234567890);
    EXPECT_EQ(status.st_mtim.tv_nsec, 123456789);
    std::filesystem::remove(directory_ / "copy");
  }
}

TEST_F(FileManagerTest, CopyOfAFileThatIsCutMeanwhileIsRefused) {
  const std::string source = directory_ / "source";
  for (const std::size_t left : {0U, 1U, 299999U}) {
    for (const bool isCopiedBefore : {false, true}) {
      directory_.addFile("source", largeContent(300000));
      int calls = 0;
      const Interposed cut(&InterposedCalls::copy_file_range, std::function([&](std::size_t) {
        // Before anything of it was read, and after all was.
        if (isCopiedBefore && ++calls == 1) return ssize_t{300000};
        std::filesystem::resize_file(source, left);
        if (!isCopiedBefore) return ssize_t{0};
        errno = EXDEV;
        return ssize_t{-1};
      }));
      EXPECT_FALSE(copyFile(source, directory_ / "copy")) << left << isCopiedBefore;
      EXPECT_THAT(directory_.names(), ElementsAre("source"));
    }
  }
}

TEST_F(FileManagerTest, CopyOfAFileThatIsWrittenMeanwhileIsRefused) {
  const std::string source = directory_ / "source";
  for (const char* content : {"content and more", "another"}) {
    directory_.addFile("source", "content");
    const std::array<timespec, 2> times = {timespec{5, 0}, timespec{5, 0}};
    ASSERT_EQ(::utimensat(AT_FDCWD, source.c_str(), times.data(), 0), 0);
    const Interposed writer(&InterposedCalls::copy_file_range, std::function([&](std::size_t) {
      directory_.addFile("source", content);
      return ssize_t{0};
    }));
    EXPECT_FALSE(copyFile(source, directory_ / "copy", error_)) << content;
    EXPECT_EQ(error_, (ErrorRecord{"POSIX", EIO, "The file changed while it was copied"}));
    EXPECT_THAT(directory_.names(), ElementsAre("source"));
  }
}

TEST_F(FileManagerTest, CopyOfAFileWhoseTimeChangesMeanwhileIsRefused) {
  const std::string source = directory_.addFile("source", "content");
  for (const timespec& changed : {timespec{5, 8}, timespec{6, 7}}) {
    const auto setTime = [&source](const timespec& time) {
      const std::array<timespec, 2> times = {time, time};
      return ::utimensat(AT_FDCWD, source.c_str(), times.data(), 0);
    };
    ASSERT_EQ(setTime({5, 7}), 0);
    const Interposed writer(&InterposedCalls::copy_file_range, std::function([&](std::size_t) {
      setTime(changed);
      return ssize_t{0};
    }));
    EXPECT_FALSE(copyFile(source, directory_ / "copy"));
    EXPECT_THAT(directory_.names(), ElementsAre("source"));
  }
}

TEST_F(FileManagerTest, CopyIsOnTheDiskBeforeItHasItsName) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  const std::string source = directory_.addFile("source", "content");
  EXPECT_TRUE(holdsInChild([&] {
    return refuseSystemCall(SYS_fdatasync, EIO) && !copyFile(source, directory_ / "copy");
  }));
  EXPECT_THAT(directory_.names(), ElementsAre("source"));
}

TEST_F(FileManagerTest, CopiesIntoAnOpenDirectory) {
  const std::string source = directory_.addFile("source", "content");
  const Directory open = *Directory::open(directory_.path(), error_);
  EXPECT_TRUE(copyFile(source, {open, "copy"}));
  EXPECT_EQ(contentOf(directory_ / "copy"), "content");
  EXPECT_FALSE(copyFile(source, {open, "copy"}));
  EXPECT_FALSE(copyFile(source, {open, "sub/copy"}));
}

TEST_F(FileManagerTest, FailedReadFailsTheWhole) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  const std::string source = directory_.addFile("source", "content");
  EXPECT_TRUE(holdsInChild([&] {
    return refuseSystemCall(SYS_read, EIO) && !copyFile(source, directory_ / "copy") &&
           !wholeFile(source, error_) && error_ == ErrorRecord{"POSIX", EIO, "Input/output error"};
  }));
  EXPECT_THAT(directory_.names(), ElementsAre("source"));
}

TEST_F(FileManagerTest, DirectoryThatAnotherProcessMakesFirstIsAccepted) {
  const Interposed quicker(&InterposedCalls::mkdir,
                           std::function([](const char* path, mode_t mode) {
                             ::mkdirat(AT_FDCWD, path, mode);
                             return ::mkdirat(AT_FDCWD, path, mode);
                           }));
  EXPECT_TRUE(createDirectories(directory_ / "a/b/c", error_));
  EXPECT_EQ(error_, std::nullopt);
  EXPECT_TRUE(std::filesystem::is_directory(directory_ / "a/b/c"));
}

TEST_F(FileManagerTest, CopyRefusesAnExistingDestination) {
  const std::string source = directory_.addFile("source", "new");
  directory_.addFile("file", "kept");
  std::filesystem::create_directory(directory_ / "directory");
  std::filesystem::create_symlink("nowhere", directory_ / "dangling");
  for (const char* name : {"file", "directory", "dangling", "source"}) {
    EXPECT_FALSE(copyFile(source, directory_ / name)) << name;
  }
  EXPECT_EQ(contentOf(directory_ / "file"), "kept");
  EXPECT_EQ(contentOf(source), "new");
  EXPECT_THAT(directory_.names(), ElementsAre("dangling", "directory", "file", "source"));
}

TEST_F(FileManagerTest, CopyRefusesWhatIsNoRegularFile) {
  std::vector<std::string> sources = specialFiles();
  sources.insert(sources.end(), {"", directory_ / "missing", directory_.path()});
  for (const std::string& source : sources) {
    EXPECT_FALSE(copyFile(source, directory_ / "copy")) << source;
  }
  EXPECT_THAT(directory_.names(), ElementsAre("fifo", "socket"));
}

TEST_F(FileManagerTest, CopyIntoAMissingDirectoryFails) {
  const std::string source = directory_.addFile("source", "new");
  EXPECT_FALSE(copyFile(source, directory_ / "missing/copy"));
  EXPECT_FALSE(copyFile(source, ""));
  EXPECT_THAT(directory_.names(), ElementsAre("source"));
}

}  // namespace
}  // namespace platform
