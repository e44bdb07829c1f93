#include "companions/common/QELCommandLine.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "platform/files/StandardStreams.h"

namespace {

struct Outcome {
  std::optional<int> status;
  std::string output;
  std::string errors;
  bool quiet = false;
  std::int64_t jobs = 4;
  std::optional<std::string> link;
  std::vector<std::string> operands;
};

Outcome outcomeOf(const std::vector<const char*>& arguments) {
  Outcome outcome;
  QELCommandLine commandLine("qel-try", "[OPTION]... FILE", "Tries.",
                             {{"quiet", 'q', "", "say less", QELTakeFlag(outcome.quiet)},
                              {"jobs", 'j', "N", "so many at once", QELTakeNumber(outcome.jobs, 1)},
                              {"link", '\0', "URL", "the page", QELTakeURL(outcome.link)}});
  testing::internal::CaptureStdout();
  testing::internal::CaptureStderr();
  outcome.status = commandLine.parse(arguments);
  platform::flushStandardOutput();
  outcome.output = testing::internal::GetCapturedStdout();
  outcome.errors = testing::internal::GetCapturedStderr();
  outcome.operands = commandLine.operands();
  return outcome;
}

TEST(QELCommandLineTest, OptionsAndOperandsAreTaken) {
  const Outcome outcome = outcomeOf({"one", "-q", "--jobs=7", "two", "--link", "http://l/"});
  EXPECT_EQ(std::nullopt, outcome.status);
  EXPECT_TRUE(outcome.quiet);
  EXPECT_EQ(7, outcome.jobs);
  EXPECT_EQ("http://l/", outcome.link);
  EXPECT_EQ((std::vector<std::string>{"one", "two"}), outcome.operands);
}

TEST(QELCommandLineTest, HelpListsTheOptions) {
  const Outcome outcome = outcomeOf({"--help"});
  EXPECT_EQ(kAllWell, outcome.status);
  EXPECT_EQ(
      "Usage: qel-try [OPTION]... FILE\n"
      "Tries.\n"
      "\n"
      "  -q, --quiet     say less\n"
      "  -j, --jobs N    so many at once\n"
      "      --link URL  the page\n"
      "  -h, --help      print this help and exit\n"
      "  -V, --version   print the version and exit\n"
      "\n"
      "The manual: man qel-try\n",
      outcome.output);
}

TEST(QELCommandLineTest, TheVersionIsPrinted) {
  const Outcome outcome = outcomeOf({"-V", "--nonsense="});
  EXPECT_EQ(kNothingDone, outcome.status);  // wrong use comes first
  EXPECT_EQ("qel-try " QEL_VERSION "\n", outcomeOf({"-V"}).output);
  EXPECT_EQ(kAllWell, outcomeOf({"-V"}).status);
}

TEST(QELCommandLineTest, WrongUseIsOneLineThatPointsToTheHelp) {
  for (const auto& [word, message] : std::vector<std::pair<const char*, std::string>>{
           {"--nope", "unrecognized option '--nope'"},
           {"--jobs=0", "'0' is no value of option '--jobs'"},
           {"--jobs=4x", "'4x' is no value of option '--jobs'"},
           {"--jobs=99999999999999999999", "'99999999999999999999' is no value of option '--jobs'"},
           {"--jobs=", "'' is no value of option '--jobs'"},
           {"--link=", "'' is no value of option '--link'"}}) {
    const Outcome outcome = outcomeOf({word});
    EXPECT_EQ(kNothingDone, outcome.status) << word;
    EXPECT_EQ("qel-try: " + message + "; see 'qel-try --help'\n", outcome.errors);
    EXPECT_EQ("", outcome.output);
  }
}

TEST(QELCommandLineTest, LanguageIsATag) {
  std::optional<std::string> tag;
  const auto take = QELTakeLanguage(tag);
  for (const char* value : {"en", "pt-BR", "zh-Hant-TW", "de-1996", "i-klingon"}) {
    EXPECT_TRUE(take(value)) << value;
    EXPECT_EQ(tag, value);
  }
  for (const char* value : {"", "-", "en-", "-en", "en--us", "1996", "en_US", "en us", "e\u00F1",
                            "en@", "en`", "en/"}) {
    EXPECT_FALSE(take(value)) << value;
  }
}

TEST(QELCommandLineTest, DirectoryIsAPrefixAndItsNamespace) {
  QELDirectory directory;
  const auto take = QELTakeDirectory(directory);
  for (const char* value : {"acme=https://acme.example/ns?a=b", "_a-1.b=urn:x"}) {
    EXPECT_TRUE(take(value)) << value;
    EXPECT_EQ(directory.prefix + "=" + directory.uri, value);
  }
  for (const char* value :
       {"", "=", "acme", "acme=", "acme=relative", "=urn:x", "1a=urn:x", "a:b=urn:x", "a b=urn:x",
        "XmlThing=urn:x", "dc=urn:x", "qel=urn:x", "atom=urn:x", "a=has blank"}) {
    EXPECT_FALSE(take(value)) << value;
  }
}

}  // namespace
