#include "platform/files/Paths.h"

#include <gtest/gtest.h>
#include <pwd.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <filesystem>

#include "platform/files/PosixError.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/EnvironmentGuard.h"
#include "tests/support/TemporaryDirectory.h"

namespace platform {
namespace {

struct ComponentRow {
  std::string_view path;
  std::string_view lastComponent;
  std::string_view extension;
  std::string_view withoutExtension;
};

constexpr std::array kComponentRows = {
    ComponentRow{"", "", "", ""},
    ComponentRow{"/", "", "", "/"},
    ComponentRow{"//", "", "", "//"},
    ComponentRow{"a", "a", "", "a"},
    ComponentRow{"a.mp3", "a.mp3", "mp3", "a"},
    ComponentRow{"a.MP3", "a.MP3", "MP3", "a"},
    ComponentRow{"a.b.mp3", "a.b.mp3", "mp3", "a.b"},
    ComponentRow{"/media/a.mp3", "a.mp3", "mp3", "/media/a"},
    ComponentRow{"shows/a.podcast/", "a.podcast", "podcast", "shows/a"},
    ComponentRow{"shows/a.podcast//", "a.podcast", "podcast", "shows/a"},
    ComponentRow{"a.d/b", "b", "", "a.d/b"},
    ComponentRow{"a.d/b/", "b", "", "a.d/b/"},
    ComponentRow{".profile", ".profile", "", ".profile"},
    ComponentRow{"x/.profile", ".profile", "", "x/.profile"},
    ComponentRow{".profile.txt", ".profile.txt", "txt", ".profile"},
    ComponentRow{"name.", "name.", "", "name"},
    ComponentRow{"name..", "name..", "", "name."},
    ComponentRow{"..mp3", "..mp3", "mp3", "."},
    ComponentRow{".", ".", "", "."},
    ComponentRow{"..", "..", "", ".."},
    ComponentRow{"...", "...", "", "..."},
    ComponentRow{"a/..", "..", "", "a/.."},
    ComponentRow{"a b.m p", "a b.m p", "m p", "a b"},
    ComponentRow{"caf\u00e9.mp3", "caf\u00e9.mp3", "mp3", "caf\u00e9"},
};

TEST(PathsTest, LastPathComponent) {
  for (const ComponentRow& row : kComponentRows) {
    EXPECT_EQ(lastPathComponent(row.path), row.lastComponent) << '"' << row.path << '"';
  }
}

TEST(PathsTest, PathExtension) {
  for (const ComponentRow& row : kComponentRows) {
    EXPECT_EQ(pathExtension(row.path), row.extension) << '"' << row.path << '"';
  }
}

TEST(PathsTest, PathWithoutExtension) {
  for (const ComponentRow& row : kComponentRows) {
    EXPECT_EQ(pathWithoutExtension(row.path), row.withoutExtension) << '"' << row.path << '"';
  }
}

TEST(PathsTest, JoinedPath) {
  struct Row {
    std::string_view parent;
    std::string_view child;
    std::string_view joined;
  };
  for (const Row& row : std::array<Row, 13>{{
           {"a", "b", "a/b"},
           {"a/", "b", "a/b"},
           {"a", "/b", "a/b"},
           {"a/", "/b", "a/b"},
           {"a//", "//b", "a/b"},
           {"a//b", "c//d", "a/b/c/d"},
           {"/", "b", "/b"},
           {"/", "/media/a.mp3", "/media/a.mp3"},
           {"a", "b/", "a/b/"},
           {"", "b", "b"},
           {"a", "", "a"},
           {"", "", ""},
           {"/bundle", "../x", "/bundle/../x"},
       }}) {
    EXPECT_EQ(joinedPath(row.parent, row.child), row.joined)
        << '"' << row.parent << "\" and \"" << row.child << '"';
  }
}

TEST(PathsTest, IsAbsolutePath) {
  for (const std::string_view path : {"/", "//", "/a", "/../a"}) {
    EXPECT_TRUE(isAbsolutePath(path)) << path;
  }
  for (const std::string_view path : {"", "a", "a/b", "./a", "../a", "~", "~/a", " /a"}) {
    EXPECT_FALSE(isAbsolutePath(path)) << path;
  }
}

TEST(PathsTest, StandardisedPath) {
  const EnvironmentGuard home("HOME", "/home/u/./");
  struct Row {
    std::string_view path;
    std::string_view standardised;
  };
  for (const Row& row : std::array<Row, 28>{{
           {"", ""},
           {"/", "/"},
           {"///", "/"},
           {"/a", "/a"},
           {"/a/", "/a"},
           {"//a//b//", "/a/b"},
           {"/a/./b/.", "/a/b"},
           {"/a/../b", "/b"},
           {"/a/..", "/"},
           {"/..", "/"},
           {"/../../a", "/a"},
           {"/home/u/shows/../a.podcast", "/home/u/a.podcast"},
           {"a", "a"},
           {"a/", "a"},
           {"a/../b", "b"},
           {"./a", "a"},
           {"../a", "../a"},
           {"../../a", "../../a"},
           {"a/../../b", "../b"},
           {"..", ".."},
           {"a/..", "."},
           {".", "."},
           {"/a/...", "/a/..."},
           {"~", "/home/u"},
           {"~/a", "/home/u/a"},
           {"~/../v", "/home/v"},
           {"a/~", "a/~"},
           {"/~/a", "/~/a"},
       }}) {
    EXPECT_EQ(standardisedPath(row.path), row.standardised) << '"' << row.path << '"';
  }
}

TEST(PathsTest, TildeWithoutHomeIsTheUsersEntry) {
  const passwd* entry = ::getpwuid(::getuid());
  if (entry == nullptr) GTEST_SKIP() << "this user has no entry";
  const std::string expected = standardisedPath(joinedPath(entry->pw_dir, "a"));
  for (const char* home : {static_cast<const char*>(nullptr), ""}) {
    const EnvironmentGuard guard("HOME", home);
    EXPECT_EQ(standardisedPath("~/a"), expected);
  }
}

TEST(PathsTest, TildeWithANameIsThatUsersHome) {
  const EnvironmentGuard home("HOME", "/home/u");
  EXPECT_EQ(standardisedPath("~qel-no-such-user/a/."), "~qel-no-such-user/a");
  const passwd* root = ::getpwnam("root");
  if (root == nullptr) GTEST_SKIP() << "there is no user named root";
  EXPECT_EQ(standardisedPath("~root/a"), standardisedPath(joinedPath(root->pw_dir, "a")));
}

TEST(PathsTest, CurrentDirectory) {
  const TemporaryDirectory directory;
  const std::string expected = std::filesystem::canonical(directory.path()).string();
  EXPECT_EQ(exitStatusOfChild([&] {
              std::filesystem::current_path(directory.path());
              ErrorSlot error;
              if (currentDirectory(error) != expected || error) return 1;
              std::filesystem::remove(directory.path());
              return !currentDirectory(error) && error == posixError(ENOENT) ? 0 : 2;
            }),
            0);
}

TEST(PathsTest, TemporaryDirectory) {
  for (const auto& [value, expected] : std::array<std::pair<const char*, const char*>, 3>{{
           {"/var/scratch", "/var/scratch"},
           {"", "/tmp"},
           {nullptr, "/tmp"},
       }}) {
    const EnvironmentGuard guard("TMPDIR", value);
    EXPECT_EQ(temporaryDirectory(), expected);
  }
}

}  // namespace
}  // namespace platform
