#include "companions/check/QELReferenceCheck.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

#include "companions/check/QELBundleCheck.h"
#include "companions/check/QELLocationCheck.h"
#include "companions/check/QELPublishingCheck.h"
#include "tests/support/PrintedFindings.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

constexpr std::size_t kMost = 9;

/// A reference file of episodes with these entries, each on a line of its own from the second on.
std::string listOf(const std::vector<std::string>& episodes) {
  std::string list =
      "<plist><dict><key>PodcastName</key><string>n</string><key>Episodes</key><array>";
  for (const std::string& episode : episodes) list += "\n<dict>" + episode + "</dict>";
  return list + "</array></dict></plist>";
}

std::string entry(const std::string& key, const std::string& text) {
  return "<key>" + key + "</key><string>" + text + "</string>";
}

/// What is found in a plain reference file of one episode.
std::vector<std::string> foundIn(const std::string& episode, bool isForPublishing = false) {
  QELFindings findings("f", kMost);
  QELCheckReferenceFile(platform::ByteSource(listOf({episode})), findings,
                        [&](const QELReferenceRecord& record) {
                          if (!record.isEpisode) return;
                          QELCheckLocation(record, "EpisodeReference", findings);
                          if (isForPublishing) QELCheckForPublishing(record, findings);
                        });
  return printedFindings(findings);
}

std::vector<std::string> foundInBundle(const std::string& directory, const std::string& list) {
  QELFindings findings("f", kMost);
  QELBundleCheck(directory, false, findings).check(platform::ByteSource(list));
  return printedFindings(findings);
}

const std::string kMissing =
    "f:2:1: warning: this episode has no \"EpisodeReference\", and so no media: add their path or "
    "URL";

TEST(QELReferenceCheckTest, KnowsTheAdvisoryLabels) {
  const std::string url = entry("EpisodeReference", "https://a.example/1.mp3");
  for (const char* label : {"Yes", "explicit", "CLEAN"}) {
    EXPECT_THAT(foundIn(url + entry("EpisodeAdvisoryLabel", label)), IsEmpty()) << label;
  }
  EXPECT_THAT(foundIn(url + entry("EpisodeAdvisoryLabel", "no")),
              ElementsAre(EndsWith("warning: the advisory label \"no\" is in no feed: write "
                                   "\"Explicit\" or \"Clean\", or leave it out")));
}

TEST(QELReferenceCheckTest, ATypeWithoutALocationIsToldWhereThereIsNone) {
  const std::string type = entry("EpisodeReferenceType", "local");
  EXPECT_THAT(
      foundIn(type),
      ElementsAre(kMissing, EndsWith("warning: \"EpisodeReferenceType\" stands here without "
                                     "\"EpisodeReference\": add that, or leave this out")));
  EXPECT_THAT(
      foundIn(type + "<key>EpisodeReference</key><true/>"),
      ElementsAre(EndsWith("warning: \"EpisodeReference\" must be a text, not a truth value: "
                           "write it in <string>")));
}

TEST(QELReferenceCheckTest, SizesAreWantedOfWhatIsNotOnTheDisk) {
  const std::string described = entry("EpisodeName", "n") + entry("EpisodeUUID", "u") +
                                "<key>EpisodeDate</key><date>2026-04-04T04:30:00Z</date>";
  const auto isWithoutSize = EndsWith(
      "warning: the size of this episode's media is not known: add \"EpisodeFileSize\", in bytes");
  const auto isPath = EndsWith("note: \"1.mp3\" is a path: qel-publish makes it a URL with --base");
  EXPECT_THAT(foundIn(described, true), ElementsAre(kMissing));
  const std::string url = entry("EpisodeReference", "https://a.example/1.mp3");
  EXPECT_THAT(foundIn(described + url, true), ElementsAre(isWithoutSize));
  EXPECT_THAT(foundIn(described + url + entry("EpisodeReferenceType", "remote"), true),
              ElementsAre(isWithoutSize));
  const std::string path = entry("EpisodeReference", "1.mp3");
  EXPECT_THAT(foundIn(described + path, true), ElementsAre(isPath));
  EXPECT_THAT(foundIn(described + path + entry("EpisodeReferenceType", "local"), true),
              ElementsAre(isPath));
}

TEST(QELReferenceCheckTest, TheURLOfMediaBecomesAGuidWhereThereAreMediaAndNoUUID) {
  const auto hasGuidOfMedia = testing::Contains(
      EndsWith("note: this episode has no \"EpisodeUUID\", so the URL of its media becomes its "
               "guid, and readers show it again when that changes: add one"));
  const std::string media = entry("EpisodeReference", "https://a.example/1.mp3");
  for (const std::string& uuid :
       {std::string(), entry("EpisodeUUID", ""), entry("EpisodeUUID", " \n"),
        std::string("<key>EpisodeUUID</key><integer>1</integer>")}) {
    EXPECT_THAT(foundIn(uuid + media, true), hasGuidOfMedia) << uuid;
    EXPECT_THAT(foundIn(uuid, true), testing::Not(hasGuidOfMedia)) << uuid;
    EXPECT_THAT(foundIn(uuid + entry("EpisodeReference", " "), true), testing::Not(hasGuidOfMedia));
  }
  EXPECT_THAT(foundIn(entry("EpisodeUUID", "u") + media, true), testing::Not(hasGuidOfMedia));
}

TEST(QELBundleCheckTest, EpisodesMayShareAPosterButNoFile) {
  const TemporaryDirectory root;
  const std::string bundle = root / "show.podcast";
  std::filesystem::create_directories(bundle + "/Posters");
  for (const char* name : {"Info.plist", "1.mp3", "2.mp3", "Posters/p.png"}) {
    root.addFile(std::string("show.podcast/") + name, "ab");
  }
  const std::string poster = entry("EpisodePosterReference", "Posters/p.png");
  const std::string one = entry("EpisodeReference", "1.mp3") + poster;
  const std::string two = entry("EpisodeReference", "2.mp3") + poster;
  EXPECT_THAT(foundInBundle(bundle, listOf({one, two})), IsEmpty());
  EXPECT_THAT(foundInBundle(bundle, listOf({one, two, one})),
              ElementsAre(HasSubstr("\"1.mp3\" is listed for a second time: each episode has its "
                                    "own file")));
  // Of a list that cannot be read nobody knows which files it lists.
  EXPECT_THAT(foundInBundle(bundle, "<plist><dict>"), ElementsAre(StartsWith("f:1:")));
}

TEST(QELBundleCheckTest, FilesThatCannotBeListedAreAnError) {
  const TemporaryDirectory root;
  const std::string bundle = root / "gone.podcast";
  EXPECT_THAT(
      foundInBundle(bundle, listOf({})),
      ElementsAre(bundle + ": error: its files cannot be listed: No such file or directory"));
}

}  // namespace
