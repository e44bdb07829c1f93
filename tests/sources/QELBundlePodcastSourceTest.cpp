#include "sources/QELBundlePodcastSource.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <memory>
#include <string>

#include "model/QELPodcastKeys.h"
#include "platform/plist/PropertyListWriter.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

namespace fs = std::filesystem;
using platform::Dictionary;
using platform::PropertyListValue;

class QELBundlePodcastSourceTest : public testing::Test {
 protected:
  QELBundlePodcastSourceTest() : previous_(fs::current_path()) {}
  ~QELBundlePodcastSourceTest() override { fs::current_path(previous_); }

  /// A bundle with the dictionary as its "Info.plist"; its path.
  std::string bundle(const Dictionary& dictionary, const char* name = "a.podcast") const {
    fs::create_directories(directory() / name);
    std::ofstream file(directory() / name / "Info.plist", std::ios::binary);
    platform::writePropertyList(dictionary, [&file](std::string_view bytes) {
      file << bytes;
      return true;
    });
    return (directory() / name).string();
  }

  static std::unique_ptr<QELBundlePodcastSource> loaded(const std::string& path) {
    auto source = QELBundlePodcastSource::initWithPath(path);
    if (!source) {
      ADD_FAILURE() << "no source for " << path;
      return nullptr;
    }
    platform::ErrorSlot error;
    EXPECT_TRUE(source->loadSourceWithError(error));
    return source;
  }

  /// Without symbolic links, as the working directory is told.
  fs::path directory() const { return fs::canonical(directory_.path()); }

 private:
  TemporaryDirectory directory_;
  fs::path previous_;
};

TEST_F(QELBundlePodcastSourceTest, WhatIsNoBundleGivesNoSource) {
  fs::create_directories(directory() / "empty.podcast");
  fs::create_directories(directory() / "bad.podcast");
  std::ofstream(directory() / "bad.podcast" / "Info.plist") << "text";
  std::ofstream(directory() / "file.podcast") << "text";
  for (const char* name : {"nowhere.podcast", "empty.podcast", "bad.podcast", "file.podcast"}) {
    EXPECT_EQ(QELBundlePodcastSource::initWithPath((directory() / name).string()), nullptr) << name;
  }
}

TEST_F(QELBundlePodcastSourceTest, SourceWithoutPathOrReferenceFileFailsWithCodeOne) {
  const platform::ErrorRecord expected{
      "QELDomain", 1, "Attempted to initialize a bundle source without a path or reference file"};
  platform::ErrorSlot error;
  EXPECT_FALSE(QELBundlePodcastSource("a.podcast", nullptr).loadSourceWithError(error));
  EXPECT_EQ(error, expected);
  error.reset();
  EXPECT_FALSE(
      QELBundlePodcastSource(std::nullopt, QELReferenceFilePodcastSource::initWithDictionary(
                                               std::make_shared<const Dictionary>()))
          .loadSourceWithError(error));
  EXPECT_EQ(error, expected);
}

TEST_F(QELBundlePodcastSourceTest, DescriptiveFieldsComeFromTheReferenceFile) {
  Dictionary dictionary{{"PodcastReference", "http://a.example/"},
                        {"PodcastReferenceType", "remote"},
                        {"AllowedPosterTypes", PropertyListValue::Array{"png"}},
                        {"AllowedEpisodeTypes", PropertyListValue::Array{"mp3"}}};
  for (const QELPodcastKey& field : QELPodcastDescriptiveKeys()) {
    dictionary.emplace(field.key, platform::Text(field.key));
  }
  const auto source = loaded(bundle(dictionary));
  for (const QELPodcastKey& field : QELPodcastDescriptiveKeys()) {
    EXPECT_EQ((*source.*field.value)(), field.key);
  }
  EXPECT_EQ(source->location(), (directory() / "a.podcast").string());
  EXPECT_EQ(source->referenceType(), "local");
  EXPECT_EQ(source->posterLocation(), std::nullopt);
  EXPECT_EQ(source->posterReferenceType(), std::nullopt);
  EXPECT_EQ(source->allowedPosterFileTypes(), QELPodcastSource::FileTypes{"png"});
  EXPECT_EQ(source->allowedEpisodeFileTypes(), QELPodcastSource::FileTypes{"mp3"});
}

TEST_F(QELBundlePodcastSourceTest, RelativePathIsMadeAbsoluteAndStandardised) {
  bundle({}, "shows/a.podcast");
  fs::current_path(directory());
  const std::string expected = (directory() / "shows/a.podcast").string();
  for (const char* path : {"shows/a.podcast", "./shows/a.podcast", "shows/../shows//a.podcast/"}) {
    EXPECT_EQ(loaded(path)->location(), platform::Text(expected)) << path;
  }
  EXPECT_EQ(loaded(directory().string() + "/./shows/../shows/a.podcast")->location(),
            platform::Text(expected));
}

TEST_F(QELBundlePodcastSourceTest, LocationsAreRebasedAndEpisodePostersAreNot) {
  const std::string path =
      bundle({{"PodcastPosterReference", "Posters/p.jpg"},
              {"Episodes",
               PropertyListValue::Array{
                   Dictionary{{"EpisodeReference", "a.mp3"},
                              {"EpisodeReferenceType", "remote"},
                              {"EpisodePosterReference", "Posters/1.jpg"},
                              {"EpisodePosterReferenceType", "local"}},
                   Dictionary{{"EpisodeReference", "/media/a.mp3"}},
                   Dictionary{{"EpisodeName", "no location"}, {"EpisodeReferenceType", "remote"}},
               }}});
  const auto source = loaded(path);
  EXPECT_EQ(source->posterLocation(), platform::Text(path + "/Posters/p.jpg"));
  EXPECT_EQ(source->posterReferenceType(), "local");
  const auto& episodes = *source->episodes();
  EXPECT_EQ(episodes[0]->location(), platform::Text(path + "/a.mp3"));
  EXPECT_EQ(episodes[0]->referenceType(), "local");
  EXPECT_EQ(episodes[0]->posterLocation(), "Posters/1.jpg");
  EXPECT_EQ(episodes[0]->posterReferenceType(), "local");
  EXPECT_EQ(episodes[1]->location(), platform::Text(path + "/media/a.mp3"));
  EXPECT_EQ(episodes[1]->referenceType(), "local");
  EXPECT_EQ(episodes[2]->location(), std::nullopt);
  EXPECT_EQ(episodes[2]->referenceType(), "remote");
}

TEST_F(QELBundlePodcastSourceTest, LoadingAgainRebasesTheSameEpisodesAgain) {
  const std::string path =
      bundle({{"PodcastPosterReference", "p.jpg"},
              {"Episodes", PropertyListValue::Array{Dictionary{{"EpisodeReference", "a.mp3"}}}}});
  const auto source = loaded(path);
  const auto episodes = source->episodes();
  platform::ErrorSlot error;
  EXPECT_TRUE(source->loadSourceWithError(error));
  EXPECT_EQ(source->episodes(), episodes);
  EXPECT_EQ(episodes->at(0)->location(), platform::Text(path + path + "/a.mp3"));
  EXPECT_EQ(source->posterLocation(), platform::Text(path + "/p.jpg"));
}

TEST_F(QELBundlePodcastSourceTest, RemotePosterIsJoinedLikeAPath) {
  const std::string path = bundle({{"PodcastPosterReference", "http://a.example/p.jpg"},
                                   {"PodcastPosterReferenceType", "remote"}});
  EXPECT_EQ(loaded(path)->posterLocation(), platform::Text(path + "/http:/a.example/p.jpg"));
}

TEST_F(QELBundlePodcastSourceTest, WithoutEpisodesTheListIsAbsent) {
  EXPECT_EQ(loaded(bundle({{"PodcastName", "t"}}))->episodes(), nullptr);
  EXPECT_TRUE(loaded(bundle({{"Episodes", PropertyListValue::Array{}}}))->episodes()->empty());
}

TEST_F(QELBundlePodcastSourceTest, AnUnknownWorkingDirectoryIsAFailure) {
  bundle({});
  EXPECT_EQ(exitStatusOfChild([&] {
              fs::create_directories(directory() / "gone");
              fs::current_path(directory() / "gone");
              QELBundlePodcastSource source("a.podcast",
                                            QELReferenceFilePodcastSource::initWithDictionary(
                                                std::make_shared<Dictionary>()));
              fs::remove(directory() / "gone");
              platform::ErrorSlot error;
              if (source.loadSourceWithError(error)) return 1;
              return error && error->description == "No such file or directory" ? 0 : 2;
            }),
            0);
}

}  // namespace
