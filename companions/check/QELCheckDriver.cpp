#include "companions/check/QELCheckDriver.h"

#include <cstddef>
#include <filesystem>
#include <limits>
#include <optional>
#include <string>
#include <system_error>
#include <utility>

#include "companions/check/QELBundleCheck.h"
#include "companions/check/QELFeedCheck.h"
#include "companions/check/QELLocationCheck.h"
#include "companions/check/QELPublishingCheck.h"
#include "companions/check/QELReferenceCheck.h"
#include "companions/common/QELCommandLine.h"
#include "platform/files/FileManager.h"
#include "platform/files/Paths.h"
#include "platform/files/StandardStreams.h"
#include "platform/text/Case.h"
#include "platform/xml/RootElement.h"

namespace {

struct Options {
  bool isForPublishing = false;
  bool isAll = false;
  QELDirectory directory;
};

/// Findings of one kind that are told of one file; more would hide the others.
constexpr std::size_t kMostOfAKind = 3;

/// By what it is; by its name where its beginning does not tell.
bool isPropertyList(std::string_view head, const std::string& name) {
  if (head.starts_with("bplist")) return true;
  if (const auto root = platform::rootElementName(head)) return *root == "plist" || *root == "dict";
  return platform::lowercased(platform::pathExtension(name)) == "plist";
}

void checkDocument(platform::ByteSource bytes, bool isList, const Options& options,
                   QELFindings& findings) {
  if (!isList) {
    QELCheckFeed(std::move(bytes), options.directory, options.isForPublishing, findings);
    return;
  }
  QELCheckReferenceFile(std::move(bytes), findings, [&](const QELReferenceRecord& record) {
    for (const std::string_view key : {"PodcastReference", "PodcastPosterReference",
                                       "EpisodeReference", "EpisodePosterReference"}) {
      if (key.starts_with("Episode") == record.isEpisode) QELCheckLocation(record, key, findings);
    }
    if (options.isForPublishing) QELCheckForPublishing(record, findings);
  });
}

/// The exit status of one path.
int checkPath(const std::string& path, const Options& options, const QELCommandLine& commandLine) {
  const std::size_t most = options.isAll ? std::numeric_limits<std::size_t>::max() : kMostOfAKind;
  std::error_code ignored;
  const bool isBundle = std::filesystem::is_directory(path, ignored);
  const std::string document = isBundle ? platform::joinedPath(path, "Info.plist") : path;
  QELFindings findings(document, most);

  platform::ErrorSlot error;
  std::optional<platform::ByteSource> bytes =
      path == "-" ? platform::readStandardInput() : platform::openWholeFile(document, error);
  const std::string head(bytes ? bytes->head(error) : "");
  if (error) {
    commandLine.report(document + ": " + error->description);
    return kNothingDone;
  }
  if (isBundle) {
    QELBundleCheck(path, options.isForPublishing, findings).check(std::move(*bytes));
  } else {
    checkDocument(std::move(*bytes), isPropertyList(head, path), options, findings);
  }
  return findings.print() ? kSomethingToLookAt : kAllWell;
}

}  // namespace

int QELRunCheck(std::span<const char* const> commandLine) {
  Options options;
  QELCommandLine arguments(
      "qel-check", "[OPTION]... PATH...",
      "Tells what is wrong with reference files, bundles and feeds, where, and what to\n"
      "do about it. A PATH of \"-\" is standard input.",
      {{"for-publishing", 'p', "", "tell as well what readers and directories lack",
        QELTakeFlag(options.isForPublishing)},
       {"directory", 'd', "NAME=URI", "read podcast-directory elements under this prefix",
        QELTakeDirectory(options.directory)},
       {"all", 'a', "", "tell all findings, not a few of each kind", QELTakeFlag(options.isAll)}});
  if (const auto status = arguments.parse(commandLine)) return *status;
  if (arguments.operands().empty()) return arguments.wrongUse("PATH is missing");
  int status = kAllWell;
  for (const std::string& path : arguments.operands()) {
    status = std::max(status, checkPath(path, options, arguments));
  }
  return arguments.finish(status);
}
