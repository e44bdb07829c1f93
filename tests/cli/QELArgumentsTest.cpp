#include "cli/QELArguments.h"

#include <gtest/gtest.h>

#include <vector>

namespace {

struct Scan {
  QELArguments arguments;
  std::optional<std::string> unknownCommand;
};

Scan scan(const std::vector<const char*>& words) {
  Scan result;
  result.arguments = QELScanArguments(words, result.unknownCommand);
  return result;
}

TEST(QELArgumentsTest, NothingGivesNothing) {
  const Scan result = scan({});
  EXPECT_EQ(result.unknownCommand, std::nullopt);
  EXPECT_EQ(result.arguments.command, std::nullopt);
  EXPECT_EQ(result.arguments.source, std::nullopt);
  EXPECT_EQ(result.arguments.outputPath, std::nullopt);
  EXPECT_EQ(result.arguments.feedFormat, std::nullopt);
  EXPECT_FALSE(result.arguments.readStandardInput);
}

TEST(QELArgumentsTest, WordsAndOptionsComeInAnyOrder) {
  const std::vector<std::vector<const char*>> orders{
      {"createfeed", "s.plist", "-f", "atom", "-d", "out", "-i"},
      {"-i", "-d", "out", "createfeed", "-f", "atom", "s.plist"},
      {"-f", "atom", "-d", "out", "-i", "createfeed", "s.plist"},
  };
  for (const auto& words : orders) {
    const QELArguments arguments = scan(words).arguments;
    EXPECT_EQ(arguments.command, "createfeed");
    EXPECT_EQ(arguments.source, "s.plist");
    EXPECT_EQ(arguments.outputPath, "out");
    EXPECT_EQ(arguments.feedFormat, "atom");
    EXPECT_TRUE(arguments.readStandardInput);
  }
}

TEST(QELArgumentsTest, OnlyTheSecondCharacterOfAnOptionCounts) {
  const QELArguments arguments = scan({"-dir", "out", "-format", "atom", "-ixyz"}).arguments;
  EXPECT_EQ(arguments.outputPath, "out");
  EXPECT_EQ(arguments.feedFormat, "atom");
  EXPECT_TRUE(arguments.readStandardInput);
}

TEST(QELArgumentsTest, UnknownOptionsAreIgnored) {
  const QELArguments arguments = scan({"-", "--", "--help", "-x", "-D", "parsefeed"}).arguments;
  EXPECT_EQ(arguments.command, "parsefeed");
  EXPECT_EQ(arguments.source, std::nullopt);
  EXPECT_EQ(arguments.outputPath, std::nullopt);
}

TEST(QELArgumentsTest, ValuesAreTakenWhateverTheyLookLike) {
  const QELArguments arguments = scan({"-d", "-f", "-f", "parsefeed", "createfeed"}).arguments;
  EXPECT_EQ(arguments.outputPath, "-f");
  EXPECT_EQ(arguments.feedFormat, "parsefeed");
  EXPECT_EQ(arguments.command, "createfeed");
}

TEST(QELArgumentsTest, LastOptionWins) {
  const QELArguments arguments = scan({"-d", "a", "-f", "rss", "-d", "b", "-f", "atom"}).arguments;
  EXPECT_EQ(arguments.outputPath, "b");
  EXPECT_EQ(arguments.feedFormat, "atom");
}

TEST(QELArgumentsTest, OptionWithNothingBehindItHasNoValue) {
  EXPECT_EQ(scan({"parsefeed", "s", "-d"}).arguments.outputPath, std::nullopt);
  EXPECT_EQ(scan({"parsefeed", "s", "-f"}).arguments.feedFormat, std::nullopt);
  EXPECT_EQ(scan({"-d", "a", "-d"}).arguments.outputPath, std::nullopt);
}

TEST(QELArgumentsTest, FurtherWordsAreIgnored) {
  const Scan result = scan({"parsefeed", "s.plist", "third", "createfeed"});
  EXPECT_EQ(result.unknownCommand, std::nullopt);
  EXPECT_EQ(result.arguments.command, "parsefeed");
  EXPECT_EQ(result.arguments.source, "s.plist");
}

TEST(QELArgumentsTest, EmptySourceIsPresent) {
  EXPECT_EQ(scan({"parsefeed", ""}).arguments.source, "");
}

TEST(QELArgumentsTest, UnknownCommandEndsTheScan) {
  for (const char* word : {"ParseFeed", "parsefeed ", "", "help", "createfeeds"}) {
    const Scan result = scan({word, "-d", "out"});
    EXPECT_EQ(result.unknownCommand, word);
    EXPECT_EQ(result.arguments.outputPath, std::nullopt) << word;
  }
}

}  // namespace
