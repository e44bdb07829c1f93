#include "cli/QELDriver.h"

#include <initializer_list>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "cli/QELSourceResolution.h"
#include "cli/common/QELProgress.h"
#include "generators/QELBundlePodcastGenerator.h"
#include "generators/QELFeedPodcastGenerator.h"
#include "generators/QELReferenceFilePodcastGenerator.h"
#include "platform/files/Paths.h"
#include "platform/files/StandardStreams.h"
#include "platform/plist/PropertyListWriter.h"
#include "platform/text/Case.h"
#include "platform/text/FormattedText.h"

namespace {

using platform::ErrorSlot;

constexpr int kSuccess = 0;
constexpr int kFailure = 1;

int fail(std::string_view format, std::initializer_list<platform::FormatArgument> arguments = {}) {
  platform::flushStandardOutput();
  platform::writeToStandardError(
      platform::formattedText(format, arguments, platform::controlsOfStandardError()));
  return kFailure;
}

std::optional<std::string_view> descriptionOf(const ErrorSlot& error) {
  if (!error) return std::nullopt;
  return error->description;
}

/// "Could not generate WHAT", with the cause where there is one.
int failToGenerate(std::string_view what, const ErrorSlot& error) {
  if (!error) return fail("Could not generate %@ because of an unspecified error.\n", {what});
  return fail("Could not generate %@: %s\n", {what, descriptionOf(error)});
}

/// Keeps what a run has made until the process ends. That gives all memory back at once; to destroy
/// a long podcast record by record would take a tenth of the run.
template <typename Object>
Object& kept(std::unique_ptr<Object> object) {
  static auto& objects = *new std::vector<std::unique_ptr<Object>>;
  return *objects.emplace_back(std::move(object));
}

std::string targetPath(const QELArguments& arguments) {
  return arguments.outputPath.value_or(std::string(platform::kStandardOutputPath));
}

}  // namespace

int QELRun(std::span<const char* const> commandLine) {
  const QELArguments arguments = QELScanArguments(commandLine);
  if (arguments.unknownCommand) {
    return fail("Command `%s' not recognized.\n", {arguments.unknownCommand});
  }
  QELShouldReportProgress = arguments.command == "createbundle" || arguments.outputPath.has_value();

  if (!QELValidateSource(arguments.source, arguments.readStandardInput)) {
    return fail("\"%s\" is not a valid podcast source.\n", {arguments.source});
  }
  std::unique_ptr<QELPodcastSource> made = arguments.readStandardInput
                                               ? initWithStandardInput()
                                               : initWithSourceString(*arguments.source);
  if (!made) {
    return fail("Could not initialize podcast source with string \"%s\".\n", {arguments.source});
  }
  return QELRunCommand(arguments, kept(std::move(made)));
}

int QELRunCommand(const QELArguments& arguments, QELPodcastSource& source) {
  QELProgress("N", "Loading/interpreting source...");
  ErrorSlot error;
  if (!source.loadSourceWithError(error)) {
    return fail("Could not load source: %s", {descriptionOf(error)});
  }

  if (arguments.command == "createbundle") {
    return QELCreateBundle(arguments, source, kept(std::make_unique<QELBundlePodcastGenerator>()));
  }
  if (arguments.command == "createfeed") {
    return QELCreateFeed(arguments, source, kept(std::make_unique<QELFeedPodcastGenerator>()));
  }
  if (arguments.command == "parsefeed") {
    return QELParseFeed(arguments, source,
                        kept(std::make_unique<QELReferenceFilePodcastGenerator>()));
  }
  return fail("No recognizable command was provided.\n");
}

int QELCreateBundle(const QELArguments& arguments, QELPodcastSource& source,
                    QELBundlePodcastGenerator& generator) {
  // The path is the bundle itself, exactly as it was given, whatever its extension.
  generator.setOutputPath(arguments.outputPath.value_or(platform::temporaryDirectory()));
  ErrorSlot error;
  if (!generator.generateFromSource(source, error)) return failToGenerate("bundle", error);
  QELProgress("N", "Done!");
  return kSuccess;
}

int QELCreateFeed(const QELArguments& arguments, QELPodcastSource& source,
                  QELFeedPodcastGenerator& generator) {
  const std::string format = platform::lowercased(arguments.feedFormat.value_or("rss"));
  if (format != "rss" && format != "atom") {
    return fail("\"%s\" is not a recognized feed format.\n", {format});
  }

  generator.setFormat(format);
  ErrorSlot error;
  if (!generator.generateFromSource(source, error)) return failToGenerate("feed", error);
  if (!generator.xmlData()) return fail("Could not generate feed: no data was produced.\n");

  // The line break is appended apart, behind whatever the target holds by then. The first
  // descriptor stays open meanwhile: the reader of a FIFO would take its end for the end of the
  // feed and leave. A reader that left all the same is not waited for again.
  const std::string target = targetPath(arguments);
  platform::OutputFile feed(target, platform::OutputFile::Mode::kReplace);
  feed.write(*generator.xmlData());
  platform::OutputFile(target, platform::OutputFile::Mode::kAppend).write("\n");
  return kSuccess;
}

int QELParseFeed(const QELArguments& arguments, QELPodcastSource& source,
                 QELReferenceFilePodcastGenerator& generator) {
  ErrorSlot error;
  if (!generator.generateFromSource(source, error)) return failToGenerate("reference file", error);
  if (!generator.referenceData()) {
    return fail("Could not generate reference file: no data was produced.\n");
  }

  platform::OutputFile output(targetPath(arguments), platform::OutputFile::Mode::kReplace);
  platform::writePropertyList(*generator.referenceData(),
                              [&output](std::string_view bytes) { return output.write(bytes); });
  return kSuccess;
}
