#include "companions/check/QELFeedCheck.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/support/PrintedFindings.h"

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;

constexpr std::size_t kMost = 9;

std::vector<std::string> foundIn(const std::string& document, bool isForPublishing = false) {
  QELFindings findings("f", kMost);
  QELCheckFeed(platform::ByteSource(document), QELDirectory(), isForPublishing, findings);
  return printedFindings(findings);
}

/// What is found in a feed with that in its channel, which is on one line.
std::vector<std::string> foundInChannel(const std::string& content, bool isForPublishing = false) {
  return foundIn("<rss version=\"2.0\"><channel>\n" + content + "\n</channel></rss>",
                 isForPublishing);
}

TEST(QELFeedCheckTest, ElementsOfAnotherDirectoryAreToldWhereTheyCouldBeTaken) {
  const std::string told =
      "is not taken: the option --directory a=URI, with the URI that xmlns:a declares, reads it "
      "here and in qel-keep";
  EXPECT_THAT(foundInChannel("<a:category text=\"x\"/>"),
              ElementsAre("f:2:1: note: \"a:category\" " + told));
  EXPECT_THAT(foundInChannel("<a:image href=\"x\"/>"),
              ElementsAre("f:2:1: note: \"a:image\" " + told));
  for (const char* element :
       {"<a:category>x</a:category>", "<a:category href=\"x\"/>", "<a:image text=\"x\"/>",
        "<category text=\"x\"/>", "<a:other text=\"x\" href=\"x\"/>"}) {
    EXPECT_THAT(foundInChannel(element), IsEmpty()) << element;
  }
}

TEST(QELFeedCheckTest, OfWhatIsNoFeedNothingElseIsTold) {
  for (const char* document :
       {"<a:image href=\"x\"><guid>g</guid></a:image>", "<feed><item/><item/></feed>"}) {
    EXPECT_THAT(foundIn(document), ElementsAre(StartsWith("f:1:1: error: "))) << document;
  }
}

TEST(QELFeedCheckTest, AnItemWithinAnotherEndsIt) {
  const std::string uuid = "<qel:uuid>u</qel:uuid>";
  EXPECT_THAT(foundInChannel("<item>" + uuid + "<item>" + uuid + "</item></item>"),
              ElementsAre("f:2:29: warning: the uuid \"u\" is that of an episode before: others "
                          "take both for one; give each its own"));
}

TEST(QELFeedCheckTest, UUIDsAreThoseByWhichEpisodesAreKnownAgain) {
  const auto items = [](const std::string& one, const std::string& other) {
    return "<item><qel:uuid>" + one + "</qel:uuid></item>\n<item><qel:uuid>" + other +
           "</qel:uuid></item>";
  };
  EXPECT_THAT(foundInChannel(items("a", "A")),
              ElementsAre("f:3:1: warning: the uuid \"A\" is that of an episode before: others "
                          "take both for one; give each its own"));
  EXPECT_THAT(foundInChannel(items("", "")), IsEmpty());
  EXPECT_THAT(foundInChannel(items(" \n", " ")), IsEmpty());
}

TEST(QELFeedCheckTest, IdentifiersCountInEpisodesAlone) {
  const std::string again =
      "warning: the guid \"g\" is that of an episode before: readers show one of the two; give "
      "each its own";
  const std::string guid = "<guid>g</guid>";
  EXPECT_THAT(foundInChannel("<item>" + guid + "</item><item>" + guid + "</item>"),
              ElementsAre("f:2:34: " + again));
  EXPECT_THAT(foundInChannel(guid + guid + "<item>" + guid + "</item>"), IsEmpty());
}

TEST(QELFeedCheckTest, TheLanguageOfAnEpisodeIsNotThatOfTheShow) {
  const std::string missing =
      "f:1:20: warning: the show has no \"language\": add one such as en, or give it to "
      "qel-publish by --language";
  const std::string language = "<language>en</language>";
  EXPECT_THAT(foundInChannel("<item>" + language + "</item>", true), Contains(missing));
  EXPECT_THAT(foundInChannel("<language> </language>", true), Contains(missing));
  EXPECT_THAT(foundInChannel(language, true), Not(Contains(missing)));
}

TEST(QELFeedCheckTest, WhatBelongsToASecondFileFollowsIt) {
  EXPECT_THAT(
      foundInChannel("<item><enclosure url=\"a\" length=\"1\" type=\"audio/mpeg\"/>"
                     "<enclosure url=\"b\" length=\"2\" type=\"audio/ogg\"/></item>"),
      ElementsAre("f:2:56: warning: \"enclosure\" makes the url of the episode \"b\", which "
                  "was \"a\": the last one counts, whatever its prefix; leave one of them "
                  "out"));
  EXPECT_THAT(foundInChannel("<item><qel:order>1</qel:order><qel:order>2</qel:order></item>"),
              IsEmpty());
}

TEST(QELFeedCheckTest, WhatIsSeldomReadIsReplacedWithANote) {
  EXPECT_THAT(
      foundInChannel("<copyright>a</copyright><copyright>b</copyright>"),
      ElementsAre("f:2:25: note: \"copyright\" makes the copyright of the show \"b\", which "
                  "was \"a\": the last one counts, whatever its prefix; leave one of them "
                  "out"));
}

}  // namespace
