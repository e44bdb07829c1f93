#include "companions/keep/QELKeepDriver.h"

#include <algorithm>
#include <climits>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <thread>
#include <utility>

#include "companions/common/QELCommandLine.h"
#include "companions/common/QELSourceLoading.h"
#include "companions/keep/QELKeepRun.h"
#include "companions/keep/QELKeptShow.h"
#include "companions/transfers/QELRetrySchedule.h"
#include "companions/transfers/QELTransfers.h"
#include "generators/QELBundleDirectory.h"
#include "model/QELSelection.h"
#include "platform/files/FileManager.h"
#include "platform/files/Paths.h"
#include "platform/text/Case.h"

namespace {

using platform::Dictionary;
using platform::ErrorSlot;

struct Options {
  std::int64_t jobs = 4;
  std::int64_t stallLimit = 60;  // seconds
  QELSelection selection;
  bool allowsLocalFiles = false;
  bool isRehearsal = false;
  bool isQuiet = false;
  QELDirectory directory;
};

int keep(const QELCommandLine& arguments, const Options& options) {
  const std::string& path = arguments.operands().back();
  const auto fail = [&](const std::string& what, const ErrorSlot& error) {
    arguments.report(what + ": " + (error ? error->description : "unspecified error"));
    return kNothingDone;
  };
  // A bundle that is there is locked first: a second run is to say so at once. One that is not
  // there is not made before its source is known.
  ErrorSlot error;
  QELBundleDirectory directory;
  std::optional<Dictionary> kept = Dictionary();
  const auto open = [&] {
    const bool isOpen =
        options.isRehearsal || directory.open(path, error, platform::Directory::Wait::kNot);
    if (isOpen) kept = QELBundleDirectory::readReferenceFile(path, error);
    return isOpen && kept;
  };
  const bool wasThere = platform::fileExists(path);
  if (wasThere && !open()) return fail(path, error);

  std::string name = arguments.operands().front();
  if (arguments.operands().size() == 1) {
    const auto remembered = platform::textForKey(*kept, "PodcastOrigin");
    if (!remembered) {
      return arguments.wrongUse("SOURCE is missing, and '" + path + "' remembers none");
    }
    name = remembered->string();
  }
  if (QELIsSourceItself(name, path)) return arguments.wrongUse("SOURCE and BUNDLE are the same");
  const int stallLimit = static_cast<int>(std::min<std::int64_t>(options.stallLimit, INT_MAX));
  QELRetrySchedule schedule;
  std::unique_ptr<QELPodcastSource> source;
  while (!(source = QELLoadedSource(name, options.directory, stallLimit, error = std::nullopt))) {
    const auto wait = error ? schedule.waitAfter(*error, "", {}) : std::nullopt;
    if (!wait) return fail(name, error);
    std::this_thread::sleep_for(*wait);
  }
  if (!wasThere && !open()) return fail(path, error);

  QELKeptShow show(*kept, directory, path);
  show.update(*source, QELLastingName(name), options.selection.of(*source),
              options.allowsLocalFiles || !QELIsOnNetwork(name));
  QELKeepRun run(arguments, show, std::move(*kept), options.isQuiet);
  if (options.isRehearsal) return run.rehearse();
  return run.fetch(directory, QELTransfers(options.jobs, stallLimit));
}

}  // namespace

int QELRunKeep(std::span<const char* const> commandLine) {
  Options options;
  const auto takeDate = [&options](const std::string& text) {
    options.selection.since = QELDateOf(text);
    return options.selection.since.has_value();
  };
  std::int64_t latest = 0;
  QELCommandLine arguments(
      "qel-keep", "[OPTION]... [SOURCE] BUNDLE",
      "Keeps a show in a bundle: fetches what is new, and never loses what is there.\n"
      "Without SOURCE it is the one that the bundle remembers.",
      {{"jobs", 'j', "N", "fetch N files at once (4)", QELTakeNumber(options.jobs, 1)},
       {"latest", '\0', "N", "of new episodes take the N latest alone", QELTakeNumber(latest, 1)},
       {"since", '\0', "DATE", "of new episodes take those since the date", takeDate},
       {"stall", '\0', "SECONDS", "give up a transfer without a byte for so long (60)",
        QELTakeNumber(options.stallLimit, 1)},
       {"allow-local", '\0', "", "let a feed of the network name local files",
        QELTakeFlag(options.allowsLocalFiles)},
       {"directory", 'd', "NAME=URI", "the prefix of podcast-directory elements (orvane)",
        QELTakeDirectory(options.directory)},
       {"dry-run", 'n', "", "tell what would be fetched, and make nothing",
        QELTakeFlag(options.isRehearsal)},
       {"quiet", 'q', "", "print nothing but failures", QELTakeFlag(options.isQuiet)}});
  if (const auto status = arguments.parse(commandLine)) return *status;
  if (latest > 0) options.selection.latest = latest;
  if (arguments.operands().empty()) return arguments.wrongUse("BUNDLE is missing");
  if (arguments.operands().size() > 2) return arguments.wrongUse("there are too many words");
  const std::string& bundle = arguments.operands().back();
  if (platform::lowercased(platform::pathExtension(bundle)) != "podcast") {
    return arguments.wrongUse("the name of BUNDLE, '" + bundle + "', does not end in .podcast");
  }
  return arguments.finish(keep(arguments, options));
}
