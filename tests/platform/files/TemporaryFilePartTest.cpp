#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <limits>
#include <string>

#include "platform/files/TemporaryFile.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/InterposedCalls.h"
#include "tests/support/RefusedSystemCall.h"
#include "tests/support/TemporaryDirectory.h"

namespace platform {
namespace {

using testing::ElementsAre;

/// Files that are written under a name of their own, and go on behind what is there.
class TemporaryFilePartTest : public testing::Test {
 protected:
  TemporaryFilePartTest() { open_ = *Directory::open(directory_.path(), error_); }

  bool createsPart(std::uint64_t keptSize, const std::string& partName = "part") {
    error_.reset();
    return file_.createPart({open_, "media"}, partName, keptSize, error_);
  }
  /// The cause of a failure, after which no file is open.
  std::string failureOf(std::uint64_t keptSize, const std::string& partName = "part") {
    EXPECT_FALSE(createsPart(keptSize, partName));
    EXPECT_EQ(file_.descriptor(), -1);
    return error_ ? error_->description : "";
  }

  TemporaryDirectory directory_;
  ErrorSlot error_;
  Directory open_;
  TemporaryFile file_;
};

TEST_F(TemporaryFilePartTest, KeepsTheBytesThatAreWantedAndNoMore) {
  for (const auto& [keptSize, whole] :
       {std::pair{0U, "-new"}, std::pair{5U, "first-new"}, std::pair{9U, "first-old-new"}}) {
    directory_.addFile("part", "first-old");
    ASSERT_TRUE(createsPart(keptSize));
    ASSERT_TRUE(file_.write("-new", error_));
    EXPECT_EQ(contentOf(directory_ / "part"), whole);
    EXPECT_THAT(directory_.names(), ElementsAre("part"));
    ASSERT_TRUE(file_.commitNew(error_));
    EXPECT_EQ(contentOf(directory_ / "media"), whole);
    EXPECT_THAT(directory_.names(), ElementsAre("media"));
    std::filesystem::remove(directory_ / "media");
  }
}

TEST_F(TemporaryFilePartTest, NamesThatAreNoneAreRefused) {
  directory_.addFile("part", "kept");
  for (const std::string& name : {std::string(), std::string("a/b"), std::string(".."),
                                  std::string("part\0", 5), directory_ / "part"}) {
    EXPECT_EQ(failureOf(0, name), "Invalid argument") << name;
  }
  EXPECT_FALSE(file_.createPart({open_, "sub/media"}, "part", 0, error_));
  EXPECT_FALSE(file_.createPart({open_, ""}, "part", 0, error_));
  EXPECT_EQ(contentOf(directory_ / "part"), "kept");
  EXPECT_THAT(directory_.names(), ElementsAre("part"));
}

TEST_F(TemporaryFilePartTest, WhatIsNotThereOrTooShortIsNotGoneOnWith) {
  EXPECT_EQ(failureOf(1), "No such file or directory");
  directory_.addFile("part", "1234");
  EXPECT_EQ(failureOf(5), "Invalid argument");
  // As a size of a file that would be negative.
  EXPECT_EQ(failureOf(std::numeric_limits<std::uint64_t>::max()), "Invalid argument");
  EXPECT_EQ(contentOf(directory_ / "part"), "1234");
  EXPECT_TRUE(createsPart(4));
  std::filesystem::remove(directory_ / "part");
  EXPECT_TRUE(createsPart(0)) << "where there is none, a new one begins";
}

TEST_F(TemporaryFilePartTest, WhatIsNoFileIsNotWritten) {
  const std::string path = directory_ / "part";
  std::filesystem::create_directory(path);
  EXPECT_EQ(failureOf(0), "Is a directory");
  EXPECT_EQ(failureOf(1), "Is a directory");
  std::filesystem::remove(path);

  std::filesystem::create_symlink(directory_.addFile("victim", "1234"), path);
  EXPECT_EQ(failureOf(4), "Too many levels of symbolic links");
  EXPECT_EQ(contentOf(directory_ / "victim"), "1234");
  std::filesystem::remove(path);

  ASSERT_EQ(::mkfifo(path.c_str(), 0600), 0);
  EXPECT_EQ(failureOf(1), "No such device or address");  // nobody reads it
  const FileDescriptor reader = FileDescriptor::open(path, O_RDONLY | O_NONBLOCK);
  EXPECT_EQ(failureOf(1), "Invalid argument");
}

TEST_F(TemporaryFilePartTest, WhatTheSystemRefusesIsTheCause) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  directory_.addFile("part", "1234");
  for (const long call : {long{SYS_ftruncate}, long{SYS_lseek}}) {
    EXPECT_TRUE(holdsInChild([&] {
      return refuseSystemCall(call, EIO) && failureOf(3) == "Input/output error";
    })) << call;
  }
  const Interposed device(&InterposedCalls::fstat, std::function([](int, struct stat*) {
    errno = EIO;
    return -1;
  }));
  EXPECT_EQ(failureOf(3), "Input/output error");
}

}  // namespace
}  // namespace platform
