#include "companions/publish/QELPublishDriver.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "cli/QELSourceResolution.h"
#include "companions/common/QELCommandLine.h"
#include "companions/common/QELPrivateURL.h"
#include "companions/common/QELSourceLoading.h"
#include "companions/publish/QELPublication.h"
#include "companions/publish/QELPublishedFeedGenerator.h"
#include "generators/QELBundleDirectory.h"
#include "platform/files/FileReplacement.h"
#include "platform/files/Paths.h"
#include "platform/net/URL.h"
#include "platform/time/PointInTime.h"
#include "sources/QELBundlePodcastSource.h"
#include "sources/QELFeedPodcastSource.h"

namespace {

using OptionalString = std::optional<std::string>;

/// As a source and as a feed: the standard streams.
constexpr std::string_view kStandardStream = "-";

struct Options {
  OptionalString base;
  OptionalString link;
  OptionalString language;
  OptionalString self;
  QELDirectory directory;
};

/// A `take` that stores a URL of the network that others are made of: nothing stands behind its
/// path.
std::function<bool(const std::string&)> takeBase(OptionalString& text) {
  return [&text, take = QELTakeURL(text)](const std::string& value) {
    if (!take(value) || value.find_first_of("?#") != std::string::npos) return false;
    if (!text->ends_with('/')) *text += '/';
    return true;
  };
}

/// The date that SOURCE_DATE_EPOCH gives to what is made, in seconds since 1970, and whether it is
/// one at all.
bool readStamp(std::optional<platform::PointInTime>& stamp) {
  const char* text = std::getenv("SOURCE_DATE_EPOCH");
  if (text == nullptr || *text == '\0') return true;
  constexpr std::int64_t kEndOfYear9999 = 253402300799;
  std::int64_t seconds = 0;
  if (!QELTakeNumber(seconds, 0)(text) || seconds > kEndOfYear9999) return false;
  stamp = platform::PointInTime(std::chrono::seconds(seconds));
  return true;
}

/// Null when the text names no source, and when standard input holds none. A feed's directory
/// elements are read under the prefix under which they are written, and under ours.
std::unique_ptr<QELPodcastSource> sourceOf(const std::string& text, const QELDirectory& directory) {
  if (text != kStandardStream) {
    return initWithSourceString(text, {QELDirectory().prefix, directory.prefix});
  }
  return QELValidateSource(std::nullopt, true) ? initWithStandardInput() : nullptr;
}

/// Finds the directory in which the files of the loaded source lie; absent for a feed of the
/// network.
bool findRoot(const std::string& text, const QELPodcastSource& source, OptionalString& root,
              platform::ErrorSlot& error) {
  std::string path = text;
  if (dynamic_cast<const QELBundlePodcastSource*>(&source) != nullptr) {
    path = source.location()->string() + "/";
  } else if (dynamic_cast<const QELFeedPodcastSource*>(&source) != nullptr) {
    const auto url = platform::URL::parse(text);
    if (!url || url->scheme() != "file") return true;
    path = url->path();
  }
  path.erase(path.rfind('/') + 1);
  if (!platform::isAbsolutePath(path)) {
    const OptionalString directory = platform::currentDirectory(error);
    if (!directory) return false;
    path = platform::joinedPath(*directory, path);
  }
  root = QELLastingName(path);
  return true;
}

/// Whether the directory has an Info.plist that remembers a private URL.
bool remembersUser(const std::string& directory) {
  platform::ErrorSlot ignored;
  const auto kept = QELBundleDirectory::readReferenceFile(directory, ignored);
  return kept && QELRemembersUser(*kept);
}

int publish(const QELCommandLine& commandLine, const Options& options,
            const std::string& sourceText, const std::string& feed) {
  std::optional<platform::PointInTime> stamp;
  if (!readStamp(stamp)) {
    commandLine.report("SOURCE_DATE_EPOCH is not a number of seconds since 1970");
    return kNothingDone;
  }
  if (QELIsSourceItself(feed, sourceText)) {
    return commandLine.wrongUse("'" + feed + "' is the source itself");
  }
  const auto source = sourceOf(sourceText, options.directory);
  if (!source) {
    commandLine.report(
        "'" + sourceText +
        "' is no podcast: neither the URL of a feed nor a reference file (.plist) or "
        "a bundle (.podcast) that can be read");
    return kNothingDone;
  }
  platform::ErrorSlot error;
  OptionalString root;
  if (!source->loadSourceWithError(error) || !findRoot(sourceText, *source, root, error)) {
    commandLine.report("cannot load '" + sourceText + "': " + error->description);
    return kNothingDone;
  }

  const bool isPrivate = options.base && root && remembersUser(*root);
  QELPublication publication(std::move(root), options.base, feed);
  publication.setLink(options.link);
  publication.prepare(*source);
  if (publication.holdsFeed()) {
    return commandLine.wrongUse("'" + feed + "' is a file of the show");
  }
  QELPublishedFeedGenerator generator(options.directory, stamp);
  generator.setLanguage(options.language);
  generator.setSelfURL(options.self);
  if (!generator.generateFromSource(*source, error) ||
      !platform::replaceFile(feed, *generator.xmlData(), error)) {
    commandLine.report("cannot write '" + feed + "': " + error->description);
    return kSomethingToLookAt;
  }

  QELRemarks remarks = publication.remarks();
  if (!options.language) remarks.add("the show has no language: name it with --language");
  if (!options.self) remarks.add("the feed does not say where it will lie: name that with --self");
  if (isPrivate) {
    remarks.add("Info.plist remembers a URL with a user or a password: do not upload that file");
  }
  for (const std::string& line : remarks.lines()) commandLine.report("warning: " + line);
  return publication.isIncomplete() ? kSomethingToLookAt : kAllWell;
}

}  // namespace

int QELRunPublish(std::span<const char* const> commandLine) {
  Options options;
  QELCommandLine arguments(
      "qel-publish", "[OPTION]... SOURCE FEED",
      "Writes the feed of a show as readers and podcast directories want it.\n"
      "SOURCE is the URL of a feed, a reference file (.plist), a bundle (.podcast),\n"
      "or - for a reference file on standard input. FEED is a file, or - for standard\n"
      "output.",
      {{"base", 'b', "URL", "where the directory of the show will lie", takeBase(options.base)},
       {"link", 'l', "URL", "the page of the show", QELTakeURL(options.link)},
       {"language", 'L', "TAG", "the language of the show, as in en or pt-BR",
        QELTakeLanguage(options.language)},
       {"self", 's', "URL", "where the feed will lie", QELTakeURL(options.self)},
       {"directory", 'd', "NAME=URI", "the prefix and namespace of directory elements",
        QELTakeDirectory(options.directory)}});
  if (const auto status = arguments.parse(commandLine)) return *status;
  const std::vector<std::string>& operands = arguments.operands();
  if (operands.empty()) return arguments.wrongUse("SOURCE and FEED are missing");
  if (operands.size() == 1) return arguments.wrongUse("FEED is missing");
  if (operands.size() > 2) return arguments.wrongUse("'" + operands[2] + "' is one word too many");
  return publish(arguments, options, operands[0], operands[1]);
}
