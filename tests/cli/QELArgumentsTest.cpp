#include "cli/QELArguments.h"

#include <gtest/gtest.h>

#include <vector>

namespace {

QELArguments scan(const std::vector<const char*>& words) {
  return QELScanArguments(words);
}

TEST(QELArgumentsTest, NothingGivesNothing) {
  const QELArguments result = scan({});
  EXPECT_EQ(result.unknownCommand, std::nullopt);
  EXPECT_EQ(result.command, std::nullopt);
  EXPECT_EQ(result.source, std::nullopt);
  EXPECT_EQ(result.outputPath, std::nullopt);
  EXPECT_EQ(result.feedFormat, std::nullopt);
  EXPECT_FALSE(result.readStandardInput);
}

TEST(QELArgumentsTest, WordsAndOptionsComeInAnyOrder) {
  const std::vector<std::vector<const char*>> orders{
      {"createfeed", "s.plist", "-f", "atom", "-d", "out", "-i"},
      {"-i", "-d", "out", "createfeed", "-f", "atom", "s.plist"},
      {"-f", "atom", "-d", "out", "-i", "createfeed", "s.plist"},
  };
  for (const auto& words : orders) {
    const QELArguments arguments = scan(words);
    EXPECT_EQ(arguments.command, "createfeed");
    EXPECT_EQ(arguments.source, "s.plist");
    EXPECT_EQ(arguments.outputPath, "out");
    EXPECT_EQ(arguments.feedFormat, "atom");
    EXPECT_TRUE(arguments.readStandardInput);
  }
}

TEST(QELArgumentsTest, OnlyTheSecondCharacterOfAnOptionCounts) {
  const QELArguments arguments = scan({"-dir", "out", "-format", "atom", "-ixyz"});
  EXPECT_EQ(arguments.outputPath, "out");
  EXPECT_EQ(arguments.feedFormat, "atom");
  EXPECT_TRUE(arguments.readStandardInput);
}

TEST(QELArgumentsTest, UnknownOptionsAreIgnored) {
  const QELArguments arguments = scan({"-", "--", "--help", "-x", "-D", "parsefeed"});
  EXPECT_EQ(arguments.command, "parsefeed");
  EXPECT_EQ(arguments.source, std::nullopt);
  EXPECT_EQ(arguments.outputPath, std::nullopt);
}

TEST(QELArgumentsTest, ValuesAreTakenWhateverTheyLookLike) {
  const QELArguments arguments = scan({"-d", "-f", "-f", "parsefeed", "createfeed"});
  EXPECT_EQ(arguments.outputPath, "-f");
  EXPECT_EQ(arguments.feedFormat, "parsefeed");
  EXPECT_EQ(arguments.command, "createfeed");
}

TEST(QELArgumentsTest, LastOptionWins) {
  const QELArguments arguments = scan({"-d", "a", "-f", "rss", "-d", "b", "-f", "atom"});
  EXPECT_EQ(arguments.outputPath, "b");
  EXPECT_EQ(arguments.feedFormat, "atom");
}

TEST(QELArgumentsTest, OptionWithNothingBehindItHasNoValue) {
  EXPECT_EQ(scan({"parsefeed", "s", "-d"}).outputPath, std::nullopt);
  EXPECT_EQ(scan({"parsefeed", "s", "-f"}).feedFormat, std::nullopt);
  EXPECT_EQ(scan({"-d", "a", "-d"}).outputPath, std::nullopt);
}

TEST(QELArgumentsTest, FurtherWordsAreIgnored) {
  const QELArguments result = scan({"parsefeed", "s.plist", "third", "createfeed"});
  EXPECT_EQ(result.unknownCommand, std::nullopt);
  EXPECT_EQ(result.command, "parsefeed");
  EXPECT_EQ(result.source, "s.plist");
}

TEST(QELArgumentsTest, EmptySourceIsPresent) {
  EXPECT_EQ(scan({"parsefeed", ""}).source, "");
}

TEST(QELArgumentsTest, UnknownCommandEndsTheScan) {
  for (const char* word : {"ParseFeed", "parsefeed ", "", "help", "createfeeds"}) {
    const QELArguments result = scan({word, "-d", "out"});
    EXPECT_EQ(result.unknownCommand, word);
    EXPECT_EQ(result.outputPath, std::nullopt) << word;
  }
}

}  // namespace
