#include "generators/QELBundlePodcastGenerator.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <functional>
#include <set>
#include <string>

#include "cli/common/QELProgress.h"
#include "platform/files/FileManager.h"
#include "platform/plist/PropertyListReader.h"
#include "tests/support/InterposedCalls.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

namespace fs = std::filesystem;
using platform::Dictionary;
using platform::PropertyListValue;
using platform::Text;

/// Media and posters are local files or file: URLs here; transfers over a network are tried end to
/// end.
class QELBundlePodcastGeneratorTest : public testing::Test {
 protected:
  QELBundlePodcastGeneratorTest() { QELShouldReportProgress = true; }

  /// A media file of this name, inside folders where the name has some; its path.
  std::string media(const std::string& name, const std::string& content = "media") const {
    const fs::path path = root() / "media" / name;
    fs::create_directories(path.parent_path());
    std::ofstream(path, std::ios::binary) << content;
    return path.string();
  }
  /// The file: URL of a media file whose path needs no escapes; `encodedName` is used as it stands.
  std::string mediaURL(const std::string& encodedName) const {
    return "file://" + (root() / "media" / encodedName).string();
  }

  void addEpisode(const platform::OptionalText& location, const char* title = "t",
                  const platform::OptionalText& poster = std::nullopt) {
    const auto episode = QELEpisode::episodeWithDictionary(nullptr);
    episode->setTitle(title);
    episode->setLocation(location);
    episode->setPosterLocation(poster);
    const auto typeOf = [](const platform::OptionalText& text) -> platform::OptionalText {
      if (!text) return std::nullopt;
      return text->view().starts_with("file:") || text->view().starts_with("http") ? "remote"
                                                                                   : "local";
    };
    episode->setReferenceType(typeOf(location));
    episode->setPosterReferenceType(typeOf(poster));
    episodes_->push_back(episode);
    source.setEpisodes(episodes_);
  }

  /// Generates a bundle at the path and keeps what was printed; the record of a failure.
  platform::ErrorSlot failureAt(std::optional<std::string> path) {
    QELBundlePodcastGenerator generator;
    EXPECT_EQ(generator.outputPath(), std::nullopt);
    generator.setOutputPath(path);
    EXPECT_EQ(generator.outputPath(), path);
    platform::ErrorSlot error;
    testing::internal::CaptureStdout();
    const bool generated = generator.generateFromSource(source, error);
    std::fflush(stdout);
    printed = testing::internal::GetCapturedStdout();
    EXPECT_EQ(generated, !error);
    return error;
  }

  /// Generates the bundle, which must succeed, and reads it back; keeps what was printed.
  Dictionary generate() {
    platform::ErrorSlot error = failureAt(bundlePath().string());
    EXPECT_EQ(error, std::nullopt);
    auto bytes = platform::openWholeFile((bundlePath() / "Info.plist").string(), error);
    if (!bytes) return {};
    std::optional<platform::PropertyListFault> fault;
    const auto value = platform::readPropertyList(std::move(*bytes), fault);
    return value && value->asDictionary() ? *value->asDictionary() : Dictionary();
  }

  /// The "EpisodeReference" of each entry.
  static std::vector<std::string> references(const Dictionary& dictionary) {
    std::vector<std::string> names;
    const PropertyListValue* episodes = platform::valueForKey(dictionary, "Episodes");
    if (!episodes) return names;
    for (const PropertyListValue& entry : *episodes->asArray()) {
      names.push_back(platform::textForKey(*entry.asDictionary(), "EpisodeReference")->string());
    }
    return names;
  }

  /// Adds each location as an episode; every one must get the name that stands behind it.
  void expectNames(const std::vector<std::pair<std::string, std::string>>& rows) {
    std::vector<std::string> expected;
    for (const auto& [location, name] : rows) {
      addEpisode(Text(location));
      expected.push_back(name);
    }
    EXPECT_EQ(references(generate()), expected);
    for (const std::string& name : expected) EXPECT_TRUE(fs::exists(bundlePath() / name)) << name;
  }

  /// Every file and directory in the bundle, relative to it.
  std::set<std::string> contents() const {
    std::set<std::string> names;
    for (const auto& entry : fs::recursive_directory_iterator(bundlePath())) {
      names.insert(fs::relative(entry.path(), bundlePath()).string());
    }
    return names;
  }

  fs::path bundlePath() const { return root() / "out" / "a.podcast"; }
  fs::path root() const { return directory_.path(); }

  QELPodcastSource source;
  std::string printed;
  /// The entry of a local "one.mp3" with the title "One" and a PNG poster.
  Dictionary entryOfOne{{"EpisodeName", "One"},
                        {"EpisodeReference", "one.mp3"},
                        {"EpisodeReferenceType", "local"},
                        {"EpisodePosterReference", "Posters/one.png"},
                        {"EpisodePosterReferenceType", "local"}};

 private:
  TemporaryDirectory directory_;
  std::shared_ptr<QELEpisodeList> episodes_ = std::make_shared<QELEpisodeList>();
};

TEST_F(QELBundlePodcastGeneratorTest, PathsThatCannotBeUsedFail) {
  EXPECT_EQ(failureAt(std::nullopt),
            (platform::ErrorRecord{"QELDomain", 1, "No output path was provided"}));
  EXPECT_EQ(failureAt(media("file") + "/a.podcast"),
            (platform::ErrorRecord{"QELDomain", 2, "Could not create bundle: Not a directory"}));
}

TEST_F(QELBundlePodcastGeneratorTest, ReferenceFileThatCannotBeWrittenFailsWithCodeOne) {
  const platform::ErrorRecord expected{"QELDomain", 1, "Could not write Info.plist file"};
  {
    const Interposed names(&InterposedCalls::getentropy, std::function([](void*, std::size_t) {
      errno = EIO;
      return -1;
    }));
    EXPECT_EQ(failureAt(bundlePath().string()), expected);
    EXPECT_EQ(contents(), std::set<std::string>{"Posters"});
  }
  fs::create_directories(bundlePath() / "Info.plist");
  addEpisode(media("a.mp3"));
  EXPECT_EQ(failureAt(bundlePath().string()), expected);
  EXPECT_EQ(contents(), (std::set<std::string>{"Info.plist", "Posters", "a.mp3"}));
}

TEST_F(QELBundlePodcastGeneratorTest, PodcastWithoutEpisodes) {
  source.setTitle("A show");
  source.setLocation("http://a.example/");
  source.setReferenceType("remote");
  EXPECT_EQ(generate(), (Dictionary{{"PodcastName", "A show"}}));
  EXPECT_EQ(contents(), (std::set<std::string>{"Info.plist", "Posters"}));
  EXPECT_EQ(printed, "[N] Fetching 0 episodes\n");
}

TEST_F(QELBundlePodcastGeneratorTest, LocalEpisodeIsCopiedAndItsEntryRewritten) {
  addEpisode(media("one.mp3", "sound"), "One", Text(media("p.png", "poster")));
  EXPECT_EQ(generate(), (Dictionary{{"Episodes", PropertyListValue::Array{entryOfOne}}}));
  EXPECT_EQ(contents(),
            (std::set<std::string>{"Info.plist", "Posters", "Posters/one.png", "one.mp3"}));
  EXPECT_EQ(printed, "[N] Fetching 1 episodes\n[N] Fetching episode 1...\n[N] Fetched episode 1\n");
}

TEST_F(QELBundlePodcastGeneratorTest, RemoteEpisodeIsDownloadedAndItsSizeKept) {
  media("one.mp3", "sound");
  media("p.png", "poster");
  addEpisode(Text(mediaURL("one.mp3")), "One", Text(mediaURL("p.png")));
  // The size is that of what was fetched last, the poster.
  entryOfOne.emplace("EpisodeFileSize", std::int64_t{6});
  EXPECT_EQ(generate(), (Dictionary{{"Episodes", PropertyListValue::Array{entryOfOne}}}));
  EXPECT_EQ(printed,
            "[N] Fetching 1 episodes\n[N] Fetching episode 1...\n"
            "[N] Downloading episode entitled \"One\" (0 bytes)...\n"
            "  -- 5 / 5 (100.0%)\n"
            "[N] Downloading poster for episode entitled \"One\"...\n"
            "[N] Fetched episode 1\n");
}

TEST_F(QELBundlePodcastGeneratorTest, Names) {
  expectNames({
      {media("0/trailing"), "trailing."},
      {media("1/show.mp3"), "show.mp3"},
      {media("2/show.MP3"), "show-2.MP3"},
      {media("3/show.aac"), "show-3.aac"},
      {media("a:b.mp3"), "ab.mp3"},
      {media("noextension"), "noextension."},
      {media(".hidden"), ".hidden."},
      {media("trailing."), "trailing-2."},
      {media("two.dots.mp3"), "two.dots.mp3"},
      {media("Podcast.mp3"), "Podcast.mp3"},
  });
}

TEST_F(QELBundlePodcastGeneratorTest, NamesOfURLs) {
  for (const char* name : {"a b.mp3", "c:d.mp3", "100%.mp3", "query.mp3", "e/f.mp3"}) media(name);
  expectNames({
      {mediaURL("a%20b.mp3"), "a b.mp3"},
      {mediaURL("c%3Ad.mp3"), "cd.mp3"},
      {mediaURL("100%25.mp3"), "100%.mp3"},
      {mediaURL("query.mp3?x=/y.ogg#z.wav"), "query.mp3"},
      {mediaURL("e%2Ff.mp3"), "e:f.mp3"},
  });
}

TEST_F(QELBundlePodcastGeneratorTest, HostileNamesStayInsideTheBundle) {
  const std::string skipped[] = {
      mediaURL("x%00.mp3"),  // NUL
      mediaURL("x%0B.mp3"),  // a control character that a reference file cannot hold
      mediaURL("x%FF.mp3"),  // no UTF-8
      mediaURL(std::string(252, 'x') + ".mp3"),  // 256 bytes
      mediaURL(".."),
      "file:///",  // no component at all
      "",          // the same for a path
      "/",
      mediaURL("Info.plist"),                  // the reference file itself
      mediaURL(".qel-0123456789abcdef.part"),  // as files in the making are called
      "http://a b/x.mp3",                      // no URL
  };
  for (const std::string& location : skipped) addEpisode(Text(location), "Bad");
  // A "/" that is encoded is a part of the name and never leads anywhere: the file that the URL
  // names is found, and saved inside.
  media("escaped.mp3");
  fs::create_directories(root() / "media" / "x");
  addEpisode(Text(mediaURL("x%2F..%2Fescaped.mp3")), "Odd");
  // Of another name than those above, which are taken.
  const std::string longest = std::string(251, 'y') + ".mp3";
  addEpisode(Text(media(longest)), "Long");
  const std::string odd = "x:..:escaped.mp3";
  const Dictionary dictionary = generate();
  EXPECT_EQ(references(dictionary), (std::vector<std::string>{odd, longest}));

  std::string expected = "[N] Fetching 13 episodes\n";
  for (std::size_t number = 1; number <= std::size(skipped); ++number) {
    const std::string n = std::to_string(number);
    expected += "[N] Fetching episode " + n +
                "...\n[W] Could not generate sane path for episode \"Bad\"\n[N] Skipping episode " +
                n + "\n";
  }
  EXPECT_EQ(printed.substr(0, expected.size()), expected);
  EXPECT_EQ(contents(), (std::set<std::string>{"Info.plist", "Posters", odd, longest}));
}

TEST_F(QELBundlePodcastGeneratorTest, EpisodesThatCannotBeFetchedAreSkippedAndKeepTheirNames) {
  source.setAllowedEpisodeFileTypes(QELPodcastSource::FileTypes{"mp3"});
  addEpisode(std::nullopt, "Lost");
  addEpisode(Text((root() / "media" / "missing" / "a.mp3").string()), "Gone");
  addEpisode(media("a.ogg"), "Wrong");
  addEpisode(media("a.Mp3"), "Here");
  EXPECT_EQ(references(generate()), (std::vector<std::string>{"a-3.Mp3"}));
  EXPECT_EQ(printed,
            "[N] Fetching 4 episodes\n[N] Fetching episode 1...\n"
            "[W] Found an episode (\"Lost\") without a specified location\n"
            "[N] Skipping episode 1\n[N] Fetching episode 2...\n"
            "[W] Could not save or download episode \"Gone\"\n"
            "[N] Skipping episode 2\n[N] Fetching episode 3...\n"
            "[W] Invalid file type \"ogg\" for episode \"Wrong\"\n"
            "[N] Skipping episode 3\n[N] Fetching episode 4...\n[N] Fetched episode 4\n");
}

TEST_F(QELBundlePodcastGeneratorTest, PodcastPosterIsSaved) {
  source.setTitle("A show");
  source.setPosterLocation(Text(mediaURL("p.PNG")));
  source.setPosterReferenceType("remote");
  source.setAllowedPosterFileTypes(QELPodcastSource::FileTypes{"png"});
  media("p.PNG");
  EXPECT_EQ(generate(), (Dictionary{{"PodcastName", "A show"},
                                    {"PodcastPosterReference", "Posters/Podcast.PNG"},
                                    {"PodcastPosterReferenceType", "local"}}));
  EXPECT_EQ(printed,
            "[N] Downloading poster for podcast entitled \"A show\"...\n[N] Fetching 0 episodes\n");
}

TEST_F(QELBundlePodcastGeneratorTest, PodcastPosterThatFailsIsWarnedAbout) {
  const struct {
    std::string location;
    const char* type;
    const char* warning;
  } rows[] = {
      {media("p.gif"), "local", "Unsupported poster image type \"gif\" for podcast \"S\""},
      {media("nothing"), "local", "Unsupported poster image type \"\" for podcast \"S\""},
      {"file://elsewhere/p.png", "remote",
       "Could not generate sane path for poster image for podcast \"S\""},
      {"/nowhere/p.png", "local", "Could not save or download poster image for podcast \"S\""},
  };
  source.setTitle("S");
  source.setAllowedPosterFileTypes(QELPodcastSource::FileTypes{"png"});
  for (const auto& row : rows) {
    source.setPosterLocation(Text(row.location));
    source.setPosterReferenceType(row.type);
    EXPECT_EQ(generate(), (Dictionary{{"PodcastName", "S"}}));
    EXPECT_EQ(printed, std::string("[W] ") + row.warning + "\n[N] Fetching 0 episodes\n");
  }
  // Without a restriction an extension can still be too long for a name.
  source.setAllowedPosterFileTypes(std::nullopt);
  source.setPosterLocation(Text("/nowhere/p." + std::string(250, 'x')));
  generate();
  EXPECT_EQ(printed,
            "[W] Could not generate sane path for poster image for podcast \"S\"\n"
            "[N] Fetching 0 episodes\n");
}

TEST_F(QELBundlePodcastGeneratorTest, EpisodePosterThatFailsLeavesTheEpisode) {
  source.setAllowedPosterFileTypes(QELPodcastSource::FileTypes{"png"});
  addEpisode(media("1.mp3"), "One", Text(media("p.gif")));
  addEpisode(media("2.mp3"), "Two", Text("http://a b/p.png"));
  addEpisode(media("3.mp3"), "Three", Text("/nowhere/p.png"));
  const Dictionary dictionary = generate();
  EXPECT_EQ(references(dictionary), (std::vector<std::string>{"1.mp3", "2.mp3", "3.mp3"}));
  for (const PropertyListValue& entry : *platform::valueForKey(dictionary, "Episodes")->asArray()) {
    EXPECT_EQ(platform::valueForKey(*entry.asDictionary(), "EpisodePosterReference"), nullptr);
    EXPECT_EQ(platform::valueForKey(*entry.asDictionary(), "EpisodePosterReferenceType"), nullptr);
  }
  EXPECT_EQ(printed,
            "[N] Fetching 3 episodes\n[N] Fetching episode 1...\n"
            "[W] Unsupported poster image type \"gif\" for episode \"One\"\n[N] Fetched episode 1\n"
            "[N] Fetching episode 2...\n"
            "[W] Could not generate sane path for poster image for episode \"Two\"\n"
            "[N] Fetched episode 2\n[N] Fetching episode 3...\n"
            "[W] Could not save or download poster image for episode \"Three\"\n"
            "[N] Fetched episode 3\n");
}

TEST_F(QELBundlePodcastGeneratorTest, EpisodeCalledPodcastTakesThePlaceOfThePodcastsPoster) {
  media("p.png", "of the show");
  media("e.png", "of the episode");
  source.setPosterLocation(Text(mediaURL("p.png")));
  source.setPosterReferenceType("remote");
  addEpisode(media("Podcast.mp3"), "t", Text(mediaURL("e.png")));
  generate();
  EXPECT_EQ(contentOf((bundlePath() / "Posters" / "Podcast.png").string()), "of the episode");
}

TEST_F(QELBundlePodcastGeneratorTest, SecondRunReplacesDownloadsAndKeepsCopiesAndStaleFiles) {
  media("remote.mp3", "old");
  addEpisode(Text(mediaURL("remote.mp3")));
  addEpisode(media("local.mp3", "old"));
  generate();
  std::ofstream(bundlePath() / "stale.mp3") << "stale";
  media("remote.mp3", "new!");
  media("local.mp3", "new!");
  // The copy does not overwrite, so its episode is skipped the second time.
  EXPECT_EQ(references(generate()), (std::vector<std::string>{"remote.mp3"}));
  EXPECT_EQ(fs::file_size(bundlePath() / "remote.mp3"), 4U);
  EXPECT_EQ(fs::file_size(bundlePath() / "local.mp3"), 3U);
  EXPECT_TRUE(fs::exists(bundlePath() / "stale.mp3"));
}

TEST_F(QELBundlePodcastGeneratorTest, SymbolicLinksInTheBundleAreNotWrittenThrough) {
  const fs::path outside = root() / "outside";
  fs::create_directories(outside);
  fs::create_directories(bundlePath());
  std::ofstream(outside / "file") << "outside";
  std::ofstream(outside / ".qel-0123456789abcdef.part") << "outside";
  fs::create_symlink(outside / "file", bundlePath() / "a.mp3");
  fs::create_symlink(outside / "new", bundlePath() / "b.mp3");
  fs::create_directory_symlink(outside, bundlePath() / "Posters");
  media("a.mp3", "media");
  media("p.png");
  addEpisode(Text(mediaURL("a.mp3")), "A", Text(mediaURL("p.png")));
  addEpisode(media("b.mp3"), "B");
  EXPECT_EQ(references(generate()), (std::vector<std::string>{"a.mp3"}));
  EXPECT_EQ(fs::file_size(outside / "file"), 7U);
  EXPECT_FALSE(fs::exists(outside / "new"));
  EXPECT_EQ(std::distance(fs::directory_iterator(outside), fs::directory_iterator()), 2);
  EXPECT_FALSE(fs::is_symlink(bundlePath() / "a.mp3"));
}

}  // namespace
