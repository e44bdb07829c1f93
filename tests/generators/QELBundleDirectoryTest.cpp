#include "generators/QELBundleDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <filesystem>
#include <functional>
#include <string>

#include "platform/files/TemporaryFile.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/InterposedCalls.h"
#include "tests/support/RefusedSystemCall.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

namespace fs = std::filesystem;
using platform::Directory;
using platform::FilePlace;
using testing::ElementsAre;

constexpr const char* kStale = ".qel-0123456789abcdef.part";

class QELBundleDirectoryTest : public testing::Test {
 protected:
  void open() { ASSERT_TRUE(bundle_.open(path(), error_)) << error_->description; }
  std::string path(const std::string& name = "") const {
    return root_ / (name.empty() ? "bundle" : "bundle/" + name);
  }
  /// Saves a file; `alias` becomes a second name of it, as on a file system that takes both for
  /// one.
  bool isSaved(const std::optional<FilePlace>& place, const std::string& content,
               const std::string& alias = "") {
    return bundle_.save(*place, [&] {
      ++fetches_;
      platform::TemporaryFile file;
      if (!file.create(*place, error_) || !file.write(content, error_) ||
          !file.commitReplacing(error_)) {
        return false;
      }
      const std::string folder = place->directory == media_.directory ? "" : "Posters/";
      if (!alias.empty()) fs::create_hard_link(path(folder + place->name), path(alias));
      return true;
    });
  }
  bool isMediaSaved(const std::string& name, const std::string& content,
                    const std::string& alias = "") {
    media_ = *bundle_.mediaPlace(name);
    return isSaved(media_, content, alias);
  }
  bool isPosterSaved(const std::string& name, const std::string& content,
                     const std::string& alias = "") {
    media_ = *bundle_.mediaPlace("any");
    return isSaved(bundle_.posterPlace(name), content, alias);
  }
  bool isWritten() { return bundle_.writeReferenceFile({{"PodcastName", "Show"}}, error_); }
  unsigned modeOf(const std::string& name) const {
    struct stat status {};
    return ::stat(path(name).c_str(), &status) == 0 ? status.st_mode & 07777U : 0;
  }

  TemporaryDirectory root_;
  platform::ErrorSlot error_;
  QELBundleDirectory bundle_;
  FilePlace media_{""};
  int fetches_ = 0;
};

TEST_F(QELBundleDirectoryTest, NamesSavedTwiceAreReplaced) {
  open();
  EXPECT_TRUE(isMediaSaved("a.mp3", "first"));
  EXPECT_TRUE(isMediaSaved("a.mp3", "second"));
  EXPECT_TRUE(isPosterSaved("a.mp3", "poster"));
  EXPECT_EQ(contentOf(path("a.mp3")), "second");
  EXPECT_EQ(contentOf(path("Posters/a.mp3")), "poster");
}

TEST_F(QELBundleDirectoryTest, ASecondRunNeedNotWait) {
  open();
  QELBundleDirectory second;
  EXPECT_FALSE(second.open(path(), error_, Directory::Wait::kNot));
  EXPECT_EQ(error_->description, "Another run is filling it");
}

TEST_F(QELBundleDirectoryTest, AReferenceFileIsRead) {
  EXPECT_EQ(QELBundleDirectory::readReferenceFile(path(), error_), platform::Dictionary());
  open();
  EXPECT_EQ(QELBundleDirectory::readReferenceFile(path(), error_), platform::Dictionary());
  EXPECT_TRUE(isWritten());
  EXPECT_EQ(QELBundleDirectory::readReferenceFile(path(), error_),
            (platform::Dictionary{{"PodcastName", "Show"}}));
  EXPECT_EQ(error_, std::nullopt);
  root_.addFile("bundle/Info.plist", "<plist><array/></plist>");
  EXPECT_EQ(QELBundleDirectory::readReferenceFile(path(), error_), std::nullopt);
  EXPECT_EQ(error_->description, "Info.plist: no dictionary at its root");
  std::filesystem::remove(path() + "/Info.plist");
  std::filesystem::create_directory(path() + "/Info.plist");
  EXPECT_EQ(QELBundleDirectory::readReferenceFile(path(), error_), std::nullopt);
  EXPECT_EQ(error_->description, "Is a directory");
}

TEST_F(QELBundleDirectoryTest, FilesOfReferencesHaveSizes) {
  open();
  root_.addFile("bundle/one.mp3", "one");
  root_.addFile("bundle/empty.mp3", "");
  EXPECT_EQ(QELBundleDirectory::sizeOfFile(path(), "one.mp3"), 3U);
  root_.addFile("outside", "stranger's");
  root_.addFile("bundle/Info.plist", "<plist/>");
  for (const char* none : {"../outside", "Posters/../../outside", "Info.plist", "./Info.plist"}) {
    EXPECT_EQ(QELBundleDirectory::sizeOfFile(path(), none), std::nullopt) << none;
  }
  for (const platform::OptionalText& none :
       {platform::OptionalText(), platform::OptionalText(""), platform::OptionalText("empty.mp3"),
        platform::OptionalText("Posters"), platform::OptionalText("missing")}) {
    EXPECT_EQ(QELBundleDirectory::sizeOfFile(path(), none), std::nullopt);
  }
}

TEST_F(QELBundleDirectoryTest, WhatWasSavedIsNotReplacedUnderAnotherName) {
  open();
  EXPECT_TRUE(isMediaSaved("show.mp3", "first", "Show.mp3"));
  EXPECT_FALSE(isMediaSaved("Show.mp3", "second"));
  EXPECT_EQ(fetches_, 1);
  EXPECT_EQ(contentOf(path("show.mp3")), "first");
  EXPECT_TRUE(isPosterSaved("show.jpg", "first", "Posters/SHOW.JPG"));
  EXPECT_FALSE(isPosterSaved("SHOW.JPG", "second"));
  EXPECT_EQ(contentOf(path("Posters/show.jpg")), "first");
}

TEST_F(QELBundleDirectoryTest, WhatWasThereBeforeIsReplacedUnderWhateverName) {
  fs::create_directory(path());
  root_.addFile("bundle/show.mp3", "of an earlier run");
  fs::create_hard_link(path("show.mp3"), path("Show.mp3"));
  open();
  EXPECT_TRUE(isMediaSaved("Show.mp3", "new"));
  EXPECT_EQ(contentOf(path("Show.mp3")), "new");
}

// Some file systems give a file another number once they have forgotten it.
TEST_F(QELBundleDirectoryTest, WhatWasSavedIsKnownByItsNameAsWell) {
  fs::create_directory(path());
  root_.addFile("bundle/one.mp3", "of an earlier run");
  open();
  EXPECT_TRUE(isMediaSaved("show.mp3", "first", "same number"));
  fs::remove(path("show.mp3"));
  root_.addFile("bundle/show.mp3", "first");
  fs::create_hard_link(path("show.mp3"), path("Show.mp3"));
  EXPECT_FALSE(isMediaSaved("Show.mp3", "second"));
  EXPECT_EQ(contentOf(path("Show.mp3")), "first");
  EXPECT_TRUE(isPosterSaved("SHOW.mp3", "poster"));
  EXPECT_TRUE(isMediaSaved("ONE.mp3", "new"));
  EXPECT_TRUE(isMediaSaved("one.mp3", "new"));
}

// The number of a file that is gone may be given to another.
TEST_F(QELBundleDirectoryTest, WhatIsGoneIsNotInTheWay) {
  open();
  EXPECT_TRUE(isMediaSaved("show.mp3", "first", "Show.mp3"));
  fs::remove(path("show.mp3"));
  EXPECT_TRUE(isMediaSaved("Show.mp3", "second"));
  EXPECT_EQ(contentOf(path("Show.mp3")), "second");
}

TEST_F(QELBundleDirectoryTest, PostersInTheBundleItselfReplaceNoMedia) {
  fs::create_directory(path());
  fs::create_symlink(".", path("Posters"));
  open();
  EXPECT_TRUE(isMediaSaved("a.jpg", "media"));
  EXPECT_FALSE(isPosterSaved("a.jpg", "poster"));
  EXPECT_TRUE(isPosterSaved("b.jpg", "poster"));
  EXPECT_FALSE(isPosterSaved("Info.plist", "poster"));
  EXPECT_EQ(contentOf(path("a.jpg")), "media");
  EXPECT_EQ(contentOf(path("b.jpg")), "poster");
  EXPECT_FALSE(fs::exists(path("Info.plist")));
}

TEST_F(QELBundleDirectoryTest, NothingTakesTheNameOfTheReferenceFile) {
  open();
  EXPECT_FALSE(bundle_.mediaPlace("Info.plist"));
  EXPECT_FALSE(isMediaSaved("info.plist", "media", "Info.plist"));
  EXPECT_FALSE(fs::exists(path("info.plist")));
  // The other name of the one file, which is the same here, stays, and is that of an earlier run.
  EXPECT_EQ(fetches_, 1);
  fs::create_hard_link(path("Info.plist"), path("INFO.plist"));
  EXPECT_FALSE(isMediaSaved("INFO.plist", "media"));
  EXPECT_EQ(fetches_, 1);
}

TEST_F(QELBundleDirectoryTest, PostersBehindALinkThatStaysInside) {
  fs::create_directories(path("art"));
  fs::create_symlink("art", path("Posters"));
  open();
  EXPECT_TRUE(isPosterSaved("a.jpg", "poster"));
  EXPECT_EQ(contentOf(path("art/a.jpg")), "poster");
}

TEST_F(QELBundleDirectoryTest, NoPosterLeavesTheBundleWhateverItsDirectoryBecomes) {
  fs::create_directories(root_ / "elsewhere");
  open();
  fs::rename(path("Posters"), path("moved"));
  fs::create_symlink("../elsewhere", path("Posters"));
  EXPECT_TRUE(isPosterSaved("a.jpg", "poster"));
  EXPECT_EQ(contentOf(path("moved/a.jpg")), "poster");
  EXPECT_TRUE(fs::is_empty(root_ / "elsewhere"));

  fs::create_directory(root_ / "other");
  fs::create_symlink("../elsewhere", root_ / "other/Posters");
  QELBundleDirectory other;
  ASSERT_TRUE(other.open(root_ / "other", error_));
  EXPECT_FALSE(other.posterPlace("a.jpg"));
  EXPECT_TRUE(other.mediaPlace("a.mp3"));
}

TEST_F(QELBundleDirectoryTest, OneAtATimeFillsIt) {
  open();
  Directory another = *Directory::open(path(), error_);
  EXPECT_EQ(another.lock(Directory::Wait::kNot), Directory::Lock::kHeldByAnother);
}

// It has been renamed, or removed, while another run held its lock.
TEST_F(QELBundleDirectoryTest, FillsTheDirectoryThatIsNamedAfterTheWait) {
  int waits = 0;
  const Interposed locks(&InterposedCalls::flock, std::function([&](int, int) {
    if (++waits == 1) fs::rename(path(), root_ / "moved");
    if (waits == 2) fs::remove_all(path());
    return 0;
  }));
  open();
  EXPECT_TRUE(isMediaSaved("a.mp3", "media"));
  EXPECT_EQ(contentOf(path("a.mp3")), "media");
  EXPECT_THAT(root_.names(), ElementsAre("bundle", "moved"));
  EXPECT_TRUE(fs::is_empty(root_ / "moved"));
}

TEST_F(QELBundleDirectoryTest, LeftoversAreRemovedFromBothDirectories) {
  fs::create_directories(path("Posters"));
  root_.addFile(std::string("bundle/") + kStale, "stale");
  root_.addFile(std::string("bundle/Posters/") + kStale, "stale");
  root_.addFile(kStale, "of somebody else");
  open();
  EXPECT_FALSE(fs::exists(path(kStale)));
  EXPECT_FALSE(fs::exists(path(std::string("Posters/") + kStale)));
  EXPECT_TRUE(fs::exists(root_ / kStale));
}

// Another run fills "Posters" as a bundle of its own; its files are not locked one by one.
TEST_F(QELBundleDirectoryTest, FilesOfARunIntoThePostersAreLeftAlone) {
  fs::create_directories(path("Posters"));
  Directory posters = *Directory::open(path("Posters"), error_);
  ASSERT_EQ(posters.lock(Directory::Wait::kForever), Directory::Lock::kTaken);
  platform::TemporaryFile living;
  ASSERT_TRUE(living.create({posters, "x"}, error_));
  open();
  EXPECT_TRUE(living.commitNew(error_)) << error_->description;
  EXPECT_TRUE(isPosterSaved("a.jpg", "poster"));
}

TEST_F(QELBundleDirectoryTest, ReferenceFileKeepsItsPermissions) {
  open();
  EXPECT_TRUE(isWritten());
  ::chmod(path("Info.plist").c_str(), 0640);
  EXPECT_TRUE(isWritten());
  EXPECT_EQ(modeOf("Info.plist"), 0640U);
  fs::remove(path("Info.plist"));
  ::chmod(root_.addFile("target", "").c_str(), 0600);
  fs::create_symlink("../target", path("Info.plist"));
  const mode_t previous = ::umask(022);
  EXPECT_TRUE(isWritten());
  ::umask(previous);
  EXPECT_EQ(modeOf("Info.plist"), 0644U);
  EXPECT_EQ(contentOf(root_ / "target"), "");
}

TEST_F(QELBundleDirectoryTest, ReferenceFileHasItsNameOnlyAfterEverythingIsOnTheDisk) {
  if (!canRefuseSystemCalls()) GTEST_SKIP() << kCannotRefuse;
  open();
  root_.addFile("bundle/Info.plist", "earlier");
  EXPECT_TRUE(holdsInChild([&] { return refuseSystemCall(SYS_syncfs, EIO) && !isWritten(); }));
  EXPECT_EQ(contentOf(path("Info.plist")), "earlier");
  EXPECT_TRUE(holdsInChild([&] { return refuseSystemCall(SYS_fsync, EIO) && !isWritten(); }));
  EXPECT_NE(contentOf(path("Info.plist")), "earlier");
  EXPECT_THAT(root_.names(), ElementsAre("bundle"));
}

TEST_F(QELBundleDirectoryTest, FailsWithTheCause) {
  root_.addFile("file", "");
  EXPECT_FALSE(bundle_.open(root_ / "file", error_));
  EXPECT_EQ(error_->description, "File exists");
  EXPECT_FALSE(bundle_.open(root_ / "file/bundle", error_));
  EXPECT_EQ(error_->description, "Not a directory");
}

}  // namespace
