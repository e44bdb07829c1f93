#include "companions/publish/QELPublication.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>

#include "tests/support/TemporaryDirectory.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr const char* kBase = "https://media.example/a/";

class QELPublicationTest : public testing::Test {
 protected:
  /// An episode of which nothing is missing but its media.
  std::shared_ptr<QELEpisode> addEpisode(const platform::OptionalText& location) {
    const auto episode = QELEpisode::episodeWithDictionary(nullptr);
    episode->setTitle(std::string("E").append(std::to_string(episodes_->size() + 1)));
    episode->setUuid(episode->title());
    episode->setDate(platform::PointInTime(std::chrono::seconds(0)));
    episode->setLocation(location);
    episodes_->push_back(episode);
    return episode;
  }

  std::vector<std::string> preparedWith(std::optional<std::string> root,
                                        std::optional<std::string> base = kBase) {
    QELPublication publication(std::move(root), std::move(base));
    podcast_.setEpisodes(episodes_);
    publication.prepare(podcast_);
    return publication.remarks().lines();
  }
  std::vector<std::string> prepared() { return preparedWith(directory_.path()); }

  void SetUp() override {
    podcast_.setTitle("t");
    podcast_.setPodcastDescription("d");
    podcast_.setLocation("https://show.example/");
    podcast_.setPosterLocation("https://show.example/p.png");
  }

  TemporaryDirectory directory_;
  QELPodcastSource podcast_;
  std::shared_ptr<QELEpisodeList> episodes_ = std::make_shared<QELEpisodeList>();
};

TEST_F(QELPublicationTest, FilesBelowTheRootGetURLsBelowTheBase) {
  std::filesystem::create_directory(directory_ / "in");
  directory_.addFile("in/a b#\xC3\xBC.mp3", "12345");
  directory_.addFile("c.png", "png");
  const std::string url = "https://media.example/a/in/a%20b%23%C3%BC.mp3";
  for (const std::string& location :
       {std::string("in/a b#\xC3\xBC.mp3"), std::string("./in//../in/a b#\xC3\xBC.mp3"),
        directory_ / "in/a b#\xC3\xBC.mp3", "FILE://" + (directory_ / "in/a%20b%23%C3%BC.mp3")}) {
    const auto episode = addEpisode(location);
    episode->setReferenceType("local");
    episode->setContentLength(7);
    episode->setPosterLocation("c.png");
    EXPECT_THAT(prepared(), IsEmpty()) << location;
    EXPECT_EQ(episode->location(), url);
    EXPECT_EQ(episode->referenceType(), "remote");
    EXPECT_EQ(episode->contentLength(), 5U);
    EXPECT_EQ(episode->contentType(), "audio/mpeg");
    EXPECT_EQ(episode->posterLocation(), "https://media.example/a/c.png");
    EXPECT_EQ(episode->posterReferenceType(), "remote");
    episodes_->clear();
  }
  podcast_.setPosterLocation("c.png");
  EXPECT_THAT(prepared(), IsEmpty());
  EXPECT_EQ(podcast_.posterLocation(), "https://media.example/a/c.png");
  EXPECT_EQ(podcast_.posterReferenceType(), "remote");
}

TEST_F(QELPublicationTest, URLsStay) {
  for (const char* location :
       {"https://a.example/1.mp3?x=%20", "HTTP://a.example/1.MP3#x", "ftp://a.example/1.mp3"}) {
    const auto episode = addEpisode(location);
    episode->setContentLength(7);
    EXPECT_THAT(preparedWith(std::nullopt, std::nullopt), IsEmpty()) << location;
    EXPECT_EQ(episode->location(), location);
    EXPECT_EQ(episode->contentLength(), 7U);
    EXPECT_EQ(episode->contentType(), "audio/mpeg");
    episodes_->clear();
  }
  const auto episode = addEpisode("https://a.example/a b.mp3");
  episode->setContentLength(7);
  EXPECT_THAT(prepared(), ElementsAre("not a valid URL, so that readers may not find it: \"E1\""));
  EXPECT_EQ(episode->location(), "https://a.example/a b.mp3");
}

TEST_F(QELPublicationTest, ThePageOfTheShowIsAURLOfTheNetwork) {
  for (const char* page : {"http://show.example/", "https://show.example/"}) {
    podcast_.setLocation(page);
    EXPECT_THAT(prepared(), IsEmpty()) << page;
    EXPECT_EQ(podcast_.location(), page);
  }
  for (const char* page : {"ftp://show.example/", "file:///show", "show", "", "http://a b/"}) {
    podcast_.setLocation(page);
    EXPECT_THAT(prepared(), ElementsAre("the show has no link: name its page with --link")) << page;
    EXPECT_EQ(podcast_.location(), std::nullopt);
  }
}

TEST_F(QELPublicationTest, TheRootMayEndInASlashAndNeedNotExist) {
  directory_.addFile("a.mp3", "12345");
  const auto episode = addEpisode("a.mp3");
  EXPECT_THAT(preparedWith(directory_ / ""), IsEmpty());
  EXPECT_EQ(episode->location(), "https://media.example/a/a.mp3");

  const std::string missing = directory_ / "missing";
  episode->setLocation(directory_ / "a.mp3");
  EXPECT_THAT(preparedWith(missing), ElementsAre("left out, since it does not lie in " + missing +
                                                 "/: \"E1\" (" + (directory_ / "a.mp3") + ")"));
  EXPECT_EQ(episode->location(), std::nullopt);
}

TEST_F(QELPublicationTest, TheRootMayBeALinkToAllFiles) {
  std::filesystem::create_symlink("/", directory_ / "all");
  const std::string file =
      std::filesystem::canonical(directory_.addFile("a.mp3", "12345")).string();
  const auto episode = addEpisode(directory_ / "a.mp3");
  EXPECT_THAT(preparedWith(directory_ / "all"), IsEmpty());
  EXPECT_EQ(episode->location(), kBase + file.substr(1));
}

TEST_F(QELPublicationTest, TheRootItselfIsNoFileOfTheShow) {
  for (const std::string& root : {directory_.path(), std::string()}) {
    const auto episode = addEpisode(root + "/");
    EXPECT_THAT(preparedWith(root + "/"), ElementsAre("left out, since it does not lie in " + root +
                                                      "/: \"E1\" (" + root + "/)"));
    EXPECT_EQ(episode->location(), std::nullopt);
    episodes_->clear();
  }
}

TEST_F(QELPublicationTest, AFileURLOfAnotherHostIsNothingToFetch) {
  directory_.addFile("a.mp3", "12345");
  const std::string url = "file://host" + (directory_ / "a.mp3");
  const auto episode = addEpisode(url);
  EXPECT_THAT(
      prepared(),
      ElementsAre("left out, since a path is nothing that others can fetch: \"E1\" (" + url + ")"));
  EXPECT_EQ(episode->location(), std::nullopt);
}

TEST_F(QELPublicationTest, OtherPathsAreLeftOut) {
  TemporaryDirectory elsewhere;
  const std::string outside = elsewhere.addFile("x.mp3", "x");
  const auto episode = addEpisode(outside);
  const auto other = addEpisode("../x.mp3");
  podcast_.setPosterLocation("../p.png");
  podcast_.setLocation(directory_.path());
  EXPECT_THAT(prepared(), ElementsAre("the show has no link: name its page with --link",
                                      "left out, since it does not lie in " + directory_.path() +
                                          "/: the poster of the show (../p.png), \"E1\" (" +
                                          outside + ") and \"E2\" (../x.mp3)"));
  EXPECT_EQ(episode->location(), std::nullopt);
  EXPECT_EQ(other->location(), std::nullopt);
  EXPECT_EQ(podcast_.posterLocation(), std::nullopt);
  EXPECT_EQ(podcast_.location(), std::nullopt);
}

TEST_F(QELPublicationTest, AShowWithoutARootHasNoFiles) {
  const auto episode = addEpisode(directory_.addFile("x.mp3", "x"));
  episode->setPosterLocation("file://" + directory_.addFile("p.png", "x"));
  EXPECT_THAT(
      preparedWith(std::nullopt),
      ElementsAre("left out, since a path is nothing that others can fetch: the poster of "
                  "\"E1\" (file://" +
                  directory_.path() + "/p.png) and \"E1\" (" + directory_.path() + "/x.mp3)"));
  EXPECT_EQ(episode->location(), std::nullopt);
  EXPECT_EQ(episode->contentLength(), 0U);
}

TEST_F(QELPublicationTest, WithoutABaseFilesAreLeftOut) {
  directory_.addFile("x.mp3", "x");
  const auto episode = addEpisode("x.mp3");
  episode->setUuid(std::nullopt);
  EXPECT_THAT(preparedWith(directory_.path(), std::nullopt),
              ElementsAre("left out, since others cannot fetch it here: name where it will lie "
                          "with --base: \"E1\" (x.mp3)",
                          "no guid, for want of a uuid: \"E1\""));
  EXPECT_EQ(episode->location(), std::nullopt);
}

TEST_F(QELPublicationTest, ARootMayBeNamedByALink) {
  std::filesystem::create_directory(directory_ / "real");
  std::filesystem::create_directory_symlink("real", directory_ / "link");
  directory_.addFile("real/x.mp3", "x");
  const auto episode = addEpisode(directory_ / "link/x.mp3");
  EXPECT_THAT(preparedWith(directory_ / "real"), IsEmpty());
  EXPECT_EQ(episode->location(), "https://media.example/a/x.mp3");
}

TEST_F(QELPublicationTest, WhatIsMissingIsTold) {
  directory_.addFile("empty.mp3", "");
  directory_.addFile("none.xyz", "x");
  addEpisode(std::nullopt);
  addEpisode("empty.mp3")->setTitle("");
  addEpisode("none.xyz")->setDate(std::nullopt);
  const auto lost = addEpisode("lost.mp3");
  lost->setUuid("E2");
  lost->setContentLength(9);
  addEpisode("https://a.example/")->setContentType("audio/x");
  podcast_.setTitle(std::nullopt);
  podcast_.setPodcastDescription("");
  podcast_.setLocation(std::nullopt);
  podcast_.setPosterLocation(std::nullopt);
  EXPECT_THAT(
      prepared(),
      ElementsAre("the show has no title", "the show has no description",
                  "the show has no link: name its page with --link", "the show has no poster",
                  "no media: \"E1\"", "no title: episode 2", "the file is empty: episode 2",
                  "no date: \"E3\"", "no type, and the extension tells none: \"E3\"",
                  "the file cannot be read: No such file or directory: \"E4\" (" +
                      directory_.path() + "/lost.mp3)",
                  "the guid is that of an episode before: readers show only one: \"E4\"",
                  "no length: \"E5\""));
  EXPECT_EQ(lost->contentLength(), 9U);  // what the source says is the best that is known
}

TEST_F(QELPublicationTest, TheLinkOfTheCallerReplacesTheShowsOwn) {
  QELPublication publication(std::nullopt, std::nullopt);
  publication.setLink("https://other.example/");
  publication.prepare(podcast_);
  EXPECT_EQ(podcast_.location(), "https://other.example/");
  EXPECT_THAT(publication.remarks().lines(), IsEmpty());
}

}  // namespace
