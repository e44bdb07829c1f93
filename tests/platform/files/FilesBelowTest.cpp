#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <optional>

#include "platform/files/FileManager.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/TemporaryDirectory.h"

namespace platform {
namespace {

using testing::ElementsAre;
using testing::Optional;

class FilesBelowTest : public testing::Test {
 protected:
  void SetUp() override {
    for (const char* name : {"root", "root/sub", "root/.hidden", "outside"}) {
      std::filesystem::create_directory(directory_ / name);
    }
    for (const char* name : {"root/b", "root/sub/a", "root/.hidden/x", "outside/x"}) {
      directory_.addFile(name, "");
    }
  }

  TemporaryDirectory directory_;
  ErrorSlot error_;
};

TEST_F(FilesBelowTest, AreListedBelowDirectoriesButNeitherHiddenNorLinkedOnes) {
  directory_.addFile("root/.file", "");
  std::filesystem::create_symlink("../outside", directory_ / "root/link");
  std::filesystem::create_symlink("../outside", directory_ / "root/.link");
  std::filesystem::create_symlink("nowhere", directory_ / "root/dangling");
  std::filesystem::create_directory(directory_ / "root/empty");
  EXPECT_THAT(filesBelow(directory_ / "root", error_),
              Optional(ElementsAre(".file", ".hidden", ".link", "b", "dangling", "link", "sub/a")));
  EXPECT_THAT(filesBelow(directory_ / "root/empty", error_), Optional(ElementsAre()));
  EXPECT_EQ(error_, std::nullopt);
}

TEST_F(FilesBelowTest, WhatCannotBeListedIsAFailure) {
  EXPECT_EQ(filesBelow(directory_ / "missing", error_), std::nullopt);
  EXPECT_EQ(error_, (ErrorRecord{"POSIX", ENOENT, "No such file or directory"}));
  EXPECT_EQ(filesBelow(directory_ / "root/b", error_), std::nullopt);
  EXPECT_EQ(error_, (ErrorRecord{"POSIX", ENOTDIR, "Not a directory"}));
}

TEST_F(FilesBelowTest, ADirectoryThatMayNotBeReadFailsTheWhole) {
  for (const char* name : {"", "root", "root/sub"}) ::chmod((directory_ / name).c_str(), 0755);
  ::chmod((directory_ / "root/sub").c_str(), 0);
  EXPECT_TRUE(holdsInChild([&] {
    constexpr uid_t kNobody = 65534;
    if (::geteuid() == 0 && ::setuid(kNobody) != 0) return false;
    return !filesBelow(directory_ / "root", error_) &&
           error_ == ErrorRecord{"POSIX", EACCES, "Permission denied"};
  }));
  ::chmod((directory_ / "root/sub").c_str(), 0755);
}

TEST_F(FilesBelowTest, WhatLiesBelowIsToldBehindLinks) {
  std::filesystem::create_symlink("outside", directory_ / "alias");
  std::filesystem::create_symlink("../outside/x", directory_ / "root/link");
  std::filesystem::create_directory(directory_ / "rootless");
  const auto liesBelowIt = [&](const char* path, const char* above) {
    return liesBelow(directory_ / path, directory_ / above);
  };
  EXPECT_TRUE(liesBelowIt("root/sub/a", "root"));
  EXPECT_TRUE(liesBelowIt("root", "root"));
  EXPECT_TRUE(liesBelowIt("root/../root/b", "root/sub/.."));
  EXPECT_TRUE(liesBelowIt("outside/x", "alias"));
  EXPECT_TRUE(liesBelow(directory_ / "outside/x", "/"));
  EXPECT_FALSE(liesBelowIt("root/link", "root"));
  EXPECT_FALSE(liesBelowIt("outside/x", "root"));
  EXPECT_FALSE(liesBelowIt("rootless", "root"));
  EXPECT_FALSE(liesBelowIt("root", "root/sub"));
  EXPECT_FALSE(liesBelow("/", directory_.path()));
}

TEST_F(FilesBelowTest, WhatCannotBeLookedAtCountsAsLyingBelow) {
  EXPECT_TRUE(liesBelow(directory_ / "missing", directory_ / "root"));
  EXPECT_TRUE(liesBelow(directory_ / "outside", directory_ / "missing"));
}

}  // namespace
}  // namespace platform
