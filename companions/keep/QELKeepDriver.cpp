#include "companions/keep/QELKeepDriver.h"

#include <algorithm>
#include <cstdint>
#include <filesystem>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <system_error>
#include <utility>

#include "cli/QELSourceResolution.h"
#include "companions/common/QELCommandLine.h"
#include "companions/keep/QELKeepRun.h"
#include "companions/keep/QELKeptShow.h"
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

bool isOnNetwork(const std::string& source) {
  return source.starts_with("http") || source.starts_with("pcast");
}

/// The source as it is remembered: where it lies, from wherever the next run is started.
std::string lastingSource(const std::string& source) {
  std::error_code ignored;
  const bool isURL = isOnNetwork(source) || source.starts_with("file:");
  return isURL ? source : std::filesystem::absolute(source, ignored).lexically_normal().string();
}

/// The source, loaded. Null, and the slot filled, when it cannot be.
std::unique_ptr<QELPodcastSource> loadedSource(const std::string& name, const Options& options,
                                               ErrorSlot& error) {
  std::unique_ptr<QELPodcastSource> source;
  if (QELValidateSource(name, false)) {
    source = initWithSourceString(name, {options.directory.prefix});
  }
  if (!source) {
    error = {"", 0, "it is no feed, and no reference file or bundle that can be read"};
    return nullptr;
  }
  if (!source->loadSourceWithError(error)) return nullptr;
  if (platform::lowercased(platform::pathExtension(name)) != "podcast") return source;
  // A bundle source leaves these as they stand in the bundle.
  static const QELEpisodeList none;
  for (const auto& episode : source->episodes() ? *source->episodes() : none) {
    const QELMediaReference poster = episode->posterReference();
    if (!poster.location || poster.location->empty() || poster.isRemote) continue;
    episode->setPosterLocation(platform::joinedPath(name, *poster.location));
  }
  return source;
}

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
  const auto open = [&] {
    return options.isRehearsal || directory.open(path, error, platform::Directory::Wait::kNot);
  };
  const bool wasThere = platform::fileExists(path);
  if (wasThere && !open()) return fail(path, error);
  std::optional<Dictionary> kept = QELBundleDirectory::readReferenceFile(path, error);
  if (!kept) return fail(platform::joinedPath(path, QELBundleDirectory::kReferenceFileName), error);

  std::string name = arguments.operands().front();
  if (arguments.operands().size() == 1) {
    const auto remembered = platform::textForKey(*kept, "PodcastOrigin");
    if (!remembered) {
      return arguments.wrongUse("SOURCE is missing, and '" + path + "' remembers none");
    }
    name = remembered->string();
  }
  std::error_code ignored;
  if (std::filesystem::equivalent(name, path, ignored)) {
    return arguments.wrongUse("SOURCE and BUNDLE are the same");
  }
  const std::unique_ptr<QELPodcastSource> source = loadedSource(name, options, error);
  if (!source) return fail(name, error);
  if (!wasThere) {
    if (!open()) return fail(path, error);
    kept = QELBundleDirectory::readReferenceFile(path,
                                                 error);  // another run may have made it meanwhile
    if (!kept) return fail(path, error);
  }

  QELKeptShow show(*kept, directory, path);
  static const QELEpisodeList none;
  show.update(*source, lastingSource(name),
              options.selection.of(source->episodes() ? *source->episodes() : none),
              options.allowsLocalFiles || !isOnNetwork(name));
  QELKeepRun run(arguments, show, std::move(*kept), options.isQuiet);
  if (options.isRehearsal) return run.rehearse();
  constexpr std::int64_t kLongest = std::numeric_limits<int>::max();
  return run.fetch(directory, path,
                   QELTransfers(static_cast<std::size_t>(options.jobs),
                                static_cast<int>(std::min(options.stallLimit, kLongest))));
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
       {"directory", '\0', "NAME=URI", "the prefix of podcast-directory elements (orvane)",
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
  return keep(arguments, options);
}
