#include "companions/common/QELSourceLoading.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <memory>
#include <string>

#include "tests/support/TemporaryDirectory.h"

namespace {

TEST(QELSourceLoadingTest, TellsWhatLiesOnTheNetwork) {
  for (const char* source : {"http://a.example/", "https://a.example/", "pcast://a.example/"}) {
    EXPECT_TRUE(QELIsOnNetwork(source)) << source;
    EXPECT_EQ(QELLastingName(source), source);
  }
  for (const char* source : {"file:///a.xml", "/a.plist", "a.podcast", "", "HTTP://a.example/"}) {
    EXPECT_FALSE(QELIsOnNetwork(source)) << source;
  }
  EXPECT_EQ(QELLastingName("file:///a/../b.xml"), "file:///a/../b.xml");
}

TEST(QELSourceLoadingTest, ASourceIsFoundFromAnyWorkingDirectory) {
  for (const char* path : {"/a/../b.plist", "/../b.plist", "//b.plist", "/./b.plist"}) {
    EXPECT_EQ(QELLastingName(path), "/b.plist") << path;
  }
  EXPECT_EQ(QELLastingName("/a/b/"), "/a/b/");
  const TemporaryDirectory directory;
  const std::string real = std::filesystem::canonical(directory.path()).string();
  const std::filesystem::path before = std::filesystem::current_path();
  std::filesystem::current_path(real);
  EXPECT_EQ(QELLastingName("b.plist"), real + "/b.plist");
  EXPECT_EQ(QELLastingName("./c/../b.plist"), real + "/b.plist");
  std::filesystem::create_directory("gone");
  std::filesystem::current_path("gone");
  std::filesystem::remove(real + "/gone");
  EXPECT_EQ(QELLastingName("b.plist"), "b.plist");
  EXPECT_EQ(QELLastingName(""), "");
  EXPECT_EQ(QELLastingName("/b.plist"), "/b.plist");
  std::filesystem::current_path(before);
}

TEST(QELSourceLoadingTest, LinksKeepTheirNamesUnlessTheWayLeadsOutOfThem) {
  const TemporaryDirectory directory;
  std::filesystem::create_directories(directory / "away/today/show");
  std::filesystem::create_directory_symlink("away/today", directory / "current");
  std::filesystem::create_directory_symlink("today", directory / "away/again");
  std::filesystem::create_symlink("current/b.plist", directory / "b.plist");
  const std::string away = std::filesystem::canonical(directory / "away").string();
  EXPECT_EQ(QELLastingName(directory / "b.plist"), directory / "b.plist");
  EXPECT_EQ(QELLastingName(directory / "away/../b.plist"), directory / "b.plist");
  EXPECT_EQ(QELLastingName(directory / "current/b.plist"), directory / "current/b.plist");
  EXPECT_EQ(QELLastingName(directory / "current/show/../b.plist"), directory / "current/b.plist");
  EXPECT_EQ(QELLastingName(directory / "current/../b.plist"), away + "/b.plist");
  EXPECT_EQ(QELLastingName(directory / "current/../again/b.plist"), away + "/again/b.plist");
}

class LoadedSourceTest : public testing::Test {
 protected:
  /// The source that a reference file with these entries is.
  std::unique_ptr<QELPodcastSource> loaded(const std::string& entries) {
    platform::ErrorSlot error;
    auto source = QELLoadedSource(
        directory_.addFile("a.plist", "<plist><dict>" + entries + "</dict></plist>"),
        QELDirectory(), 1, error);
    EXPECT_TRUE(source) << (error ? error->description : "");
    return source;
  }
  /// Where the media of an episode with that location are looked for.
  platform::OptionalText placeOf(const std::string& location) {
    const auto source =
        loaded("<key>Episodes</key><array><dict><key>EpisodeReference</key><string>" + location +
               "</string></dict></array>");
    return source->episodes()->front()->location();
  }

  TemporaryDirectory directory_;
};

TEST_F(LoadedSourceTest, PathsBeginInTheDirectoryOfTheReferenceFile) {
  EXPECT_EQ(placeOf("in/a.mp3"), directory_ / "in/a.mp3");
  for (const char* location : {"/a.mp3", "https://a.example/a.mp3", "ftp://a.example/a.mp3", ""}) {
    EXPECT_EQ(placeOf(location), location);
  }
}

TEST_F(LoadedSourceTest, AShowMayHaveNoEpisodesAndNoPoster) {
  const auto source = loaded("<key>PodcastName</key><string>n</string>");
  EXPECT_EQ(source->title(), "n");
  EXPECT_EQ(source->posterLocation(), std::nullopt);
  EXPECT_EQ(loaded("<key>PodcastPosterReference</key><string>p.png</string>")->posterLocation(),
            directory_ / "p.png");
}

}  // namespace
