#include "cli/QELDriver.h"

#include <gtest/gtest.h>

#include <ostream>
#include <string>

#include "cli/common/QELError.h"
#include "cli/common/QELProgress.h"
#include "generators/QELBundlePodcastGenerator.h"
#include "generators/QELFeedPodcastGenerator.h"
#include "generators/QELReferenceFilePodcastGenerator.h"
#include "model/QELPodcastSource.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

using platform::ErrorSlot;

/// How a service of the test ends.
enum class Ending { kWell, kWithARecord, kWithoutARecord };

bool endWith(Ending ending, ErrorSlot& error) {
  if (ending == Ending::kWithARecord) error = QELError(2, "It rains");
  return ending == Ending::kWell;
}

class Source : public QELPodcastSource {
 public:
  explicit Source(Ending ending) : ending_(ending) {}
  bool loadSourceWithError(ErrorSlot& error) override { return endWith(ending_, error); }

 private:
  Ending ending_;
};

/// A generator that ends as told without having made anything.
template <typename Base>
class Generator : public Base {
 public:
  explicit Generator(Ending ending) : ending_(ending) {}
  bool generateFromSource(QELPodcastSource&, ErrorSlot& error) override {
    return endWith(ending_, error);
  }

 private:
  Ending ending_;
};

struct Outcome {
  int status;
  std::string output;
  std::string error;

  friend bool operator==(const Outcome&, const Outcome&) = default;
  friend void PrintTo(const Outcome& outcome, std::ostream* stream) {
    *stream << outcome.status << ", \"" << outcome.output << "\", \"" << outcome.error << '"';
  }
};

template <typename Run>
Outcome outcomeOf(Run run) {
  testing::internal::CaptureStdout();
  testing::internal::CaptureStderr();
  const int status = run();
  return {status, testing::internal::GetCapturedStdout(), testing::internal::GetCapturedStderr()};
}

Outcome outcomeOfLoading(Ending ending, const QELArguments& arguments = {}) {
  Source source(ending);
  return outcomeOf([&] { return QELRunCommand(arguments, source); });
}

template <typename Base, typename Command>
Outcome outcomeOfGenerating(Command command, Ending ending, const QELArguments& arguments = {}) {
  Source source(Ending::kWell);
  Generator<Base> generator(ending);
  return outcomeOf([&] { return command(arguments, source, generator); });
}

Outcome outcomeOfBundle(Ending ending) {
  return outcomeOfGenerating<QELBundlePodcastGenerator>(QELCreateBundle, ending);
}
Outcome outcomeOfFeed(Ending ending, const QELArguments& arguments = {}) {
  return outcomeOfGenerating<QELFeedPodcastGenerator>(QELCreateFeed, ending, arguments);
}
Outcome outcomeOfReferenceFile(Ending ending, const QELArguments& arguments = {}) {
  return outcomeOfGenerating<QELReferenceFilePodcastGenerator>(QELParseFeed, ending, arguments);
}

TEST(QELDriverTest, SourceThatCannotBeLoadedIsToldWithoutALineBreak) {
  EXPECT_EQ(outcomeOfLoading(Ending::kWithARecord),
            (Outcome{1, "", "Could not load source: It rains"}));
}

TEST(QELDriverTest, SourceThatFailsWithoutARecordHasTheNullText) {
  EXPECT_EQ(outcomeOfLoading(Ending::kWithoutARecord),
            (Outcome{1, "", "Could not load source: (null)"}));
}

TEST(QELDriverTest, MissingCommandIsToldOnceTheSourceIsLoaded) {
  EXPECT_EQ(outcomeOfLoading(Ending::kWell),
            (Outcome{1, "", "No recognizable command was provided.\n"}));
}

TEST(QELDriverTest, FailedGenerationsAreToldWithTheirRecord) {
  EXPECT_EQ(outcomeOfBundle(Ending::kWithARecord),
            (Outcome{1, "", "Could not generate bundle: It rains\n"}));
  EXPECT_EQ(outcomeOfFeed(Ending::kWithARecord),
            (Outcome{1, "", "Could not generate feed: It rains\n"}));
  EXPECT_EQ(outcomeOfReferenceFile(Ending::kWithARecord),
            (Outcome{1, "", "Could not generate reference file: It rains\n"}));
}

TEST(QELDriverTest, FailedGenerationsWithoutARecordAreUnspecified) {
  EXPECT_EQ(outcomeOfBundle(Ending::kWithoutARecord),
            (Outcome{1, "", "Could not generate bundle because of an unspecified error.\n"}));
  EXPECT_EQ(outcomeOfFeed(Ending::kWithoutARecord),
            (Outcome{1, "", "Could not generate feed because of an unspecified error.\n"}));
  EXPECT_EQ(
      outcomeOfReferenceFile(Ending::kWithoutARecord),
      (Outcome{1, "", "Could not generate reference file because of an unspecified error.\n"}));
}

TEST(QELDriverTest, GenerationWithoutDataFailsAndLeavesTheTargetAlone) {
  const TemporaryDirectory directory;
  QELArguments arguments;
  arguments.outputPath = directory.addFile("kept", "content");
  EXPECT_EQ(outcomeOfFeed(Ending::kWell, arguments),
            (Outcome{1, "", "Could not generate feed: no data was produced.\n"}));
  EXPECT_EQ(outcomeOfReferenceFile(Ending::kWell, arguments),
            (Outcome{1, "", "Could not generate reference file: no data was produced.\n"}));
  EXPECT_EQ(contentOf(*arguments.outputPath), "content");
}

TEST(QELDriverTest, FinishedBundleIsToldAmongTheProgress) {
  EXPECT_EQ(outcomeOfBundle(Ending::kWell), (Outcome{0, "", ""}));
  QELShouldReportProgress = true;
  const Outcome outcome = outcomeOfBundle(Ending::kWell);
  QELShouldReportProgress = false;
  EXPECT_EQ(outcome, (Outcome{0, "[N] Done!\n", ""}));
}

TEST(QELDriverTest, FailureIsToldBehindTheProgress) {
  QELShouldReportProgress = true;
  const Outcome outcome = outcomeOfLoading(Ending::kWithARecord);
  QELShouldReportProgress = false;
  EXPECT_EQ(outcome, (Outcome{1, "[N] Loading/interpreting source...\n",
                              "Could not load source: It rains"}));
}

TEST(QELDriverTest, UnknownFormatIsRefusedBeforeTheGeneratorIsAsked) {
  QELArguments arguments;
  arguments.feedFormat = "XML";
  EXPECT_EQ(outcomeOfFeed(Ending::kWithARecord, arguments),
            (Outcome{1, "", "\"xml\" is not a recognized feed format.\n"}));
}

}  // namespace
