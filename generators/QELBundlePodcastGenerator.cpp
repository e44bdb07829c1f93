#include "generators/QELBundlePodcastGenerator.h"

#include <algorithm>
#include <string_view>
#include <utility>

#include "cli/common/QELError.h"
#include "cli/common/QELProgress.h"
#include "cli/common/QELReferenceType.h"
#include "generators/QELBundleNames.h"
#include "generators/QELNameLedger.h"
#include "model/QELPodcastKeys.h"
#include "platform/files/FileManager.h"
#include "platform/files/Paths.h"
#include "platform/files/TemporaryFile.h"
#include "platform/plist/PropertyListWriter.h"
#include "platform/text/Case.h"
#include "platform/text/FormattedText.h"
#include "platform/text/Text.h"

namespace {

using platform::Dictionary;
using platform::ErrorSlot;
using platform::Text;

constexpr std::string_view kReferenceFileName = "Info.plist";
constexpr std::string_view kPostersName = "Posters";

bool allows(const std::optional<QELPodcastSource::FileTypes>& types, std::string_view extension) {
  return !types ||
         std::find(types->begin(), types->end(), platform::lowercased(extension)) != types->end();
}

/// The directory that is filled, and the paths of the files in it.
class BundleDirectory {
 public:
  explicit BundleDirectory(std::string path)
      : path_(std::move(path)), postersPath_(platform::joinedPath(path_, kPostersName)) {}

  bool create(ErrorSlot& error) const {
    if (!platform::createDirectories(path_, error)) return false;
    platform::removeStaleTemporaryFiles(path_);
    if (leavesBundle()) return true;
    ErrorSlot ignored;  // a poster that then cannot be saved is warned about
    platform::createDirectories(postersPath_, ignored);
    platform::removeStaleTemporaryFiles(postersPath_);
    return true;
  }

  /// Absent for a name that no file can have, and for the one that the reference file has.
  std::optional<std::string> mediaPath(std::string_view name) const {
    if (!QELIsSaneName(name) || name == kReferenceFileName) return std::nullopt;
    return platform::joinedPath(path_, name);
  }

  /// Absent for a name that no file can have, and where "Posters" leads out of the bundle.
  std::optional<std::string> posterPath(std::string_view name) const {
    if (!QELIsSaneName(name) || leavesBundle()) return std::nullopt;
    return platform::joinedPath(postersPath_, name);
  }

  bool writeReferenceFile(const Dictionary& dictionary) const {
    ErrorSlot ignored;  // the caller's message does not tell causes apart
    platform::TemporaryFile file;
    return file.create(platform::joinedPath(path_, kReferenceFileName), ignored) &&
           platform::writePropertyList(
               dictionary, [&](std::string_view bytes) { return file.write(bytes, ignored); }) &&
           file.commitReplacing(ignored);
  }

 private:
  /// Nothing is written to, nor removed from, a "Posters" that is a symbolic link.
  bool leavesBundle() const { return platform::mayBeSymbolicLink(postersPath_); }

  std::string path_;
  std::string postersPath_;
};

/// A poster to fetch: the podcast's or an episode's.
struct Poster {
  std::optional<Text> location;
  std::optional<Text> referenceType;
  std::string baseName;       // of the file that it becomes
  std::string_view subject;   // "podcast" or "episode", for the warnings
  std::optional<Text> title;  // of the subject
};

/// Fetches the poster with `save`, which takes the path of the new file. The reference to it,
/// relative to the bundle; absent without a poster and, after a warning, for one that could not be
/// fetched.
template <typename Save>
std::optional<std::string> fetchPoster(const BundleDirectory& bundle,
                                       const std::optional<QELPodcastSource::FileTypes>& allowed,
                                       const Poster& poster, Save save) {
  if (!poster.location) return std::nullopt;
  const std::optional<std::string> name = QELFileName(*poster.location, poster.referenceType);
  const std::string extension(name ? platform::pathExtension(*name) : "");
  if (name && !allows(allowed, extension)) {
    QELProgress("W", "Unsupported poster image type \"%@\" for %@ \"%@\"", extension,
                poster.subject, poster.title);
    return std::nullopt;
  }
  const std::string posterName = QELNameWithExtension(poster.baseName, extension);
  const std::optional<std::string> path = name ? bundle.posterPath(posterName) : std::nullopt;
  if (!path) {
    QELProgress("W", "Could not generate sane path for poster image for %@ \"%@\"", poster.subject,
                poster.title);
    return std::nullopt;
  }
  if (!save(*path)) {
    QELProgress("W", "Could not save or download poster image for %@ \"%@\"", poster.subject,
                poster.title);
    return std::nullopt;
  }
  return platform::joinedPath(kPostersName, posterName);
}

/// Replaces the two keys of a poster by those of the bundle's file, or removes them without one.
void setPosterKeys(Dictionary& dictionary, const std::string& referenceKey,
                   const std::optional<std::string>& reference) {
  const std::string typeKey = referenceKey + "Type";
  if (reference) {
    dictionary.insert_or_assign(referenceKey, *reference);
    dictionary.insert_or_assign(typeKey, Text(kReferenceTypeLocal));
  } else {
    dictionary.erase(referenceKey);
    dictionary.erase(typeKey);
  }
}

/// Fetches the episode's media and poster. Its entry in the reference file; absent, after a
/// warning, for an episode that is left out.
std::optional<Dictionary> fetchEpisode(const BundleDirectory& bundle,
                                       const QELPodcastSource& source, QELEpisode& episode,
                                       QELNameLedger& names) {
  const std::optional<Text> location = episode.location();
  const std::optional<Text> title = episode.title();
  if (!location) {
    QELProgress("W", "Found an episode (\"%@\") without a specified location", title);
    return std::nullopt;
  }
  const std::optional<std::string> name = QELFileName(*location, episode.referenceType());
  if (!name) {
    QELProgress("W", "Could not generate sane path for episode \"%@\"", title);
    return std::nullopt;
  }
  const std::string base = names.reserve(QELBaseName(*name));
  const std::string extension(platform::pathExtension(*name));
  if (!allows(source.allowedEpisodeFileTypes(), extension)) {
    QELProgress("W", "Invalid file type \"%@\" for episode \"%@\"", extension, title);
    return std::nullopt;
  }
  const std::string mediaName = QELNameWithExtension(base, extension);
  const std::optional<std::string> path =
      QELNamesFile(*name) ? bundle.mediaPath(mediaName) : std::nullopt;
  if (!path) {
    QELProgress("W", "Could not generate sane path for episode \"%@\"", title);
    return std::nullopt;
  }
  if (!episode.saveToPath(*path)) {
    QELProgress("W", "Could not save or download episode \"%@\"", title);
    return std::nullopt;
  }
  const std::optional<std::string> poster = fetchPoster(
      bundle, source.allowedPosterFileTypes(),
      {episode.posterLocation(), episode.posterReferenceType(), base, "episode", title},
      [&](const std::string& posterPath) { return episode.savePosterToPath(posterPath); });

  // Only now: fetching sets the size to what the server announced.
  Dictionary entry = episode.dictionary();
  entry.insert_or_assign("EpisodeReference", mediaName);
  entry.insert_or_assign("EpisodeReferenceType", Text(kReferenceTypeLocal));
  setPosterKeys(entry, "EpisodePosterReference", poster);
  return entry;
}

}  // namespace

bool QELBundlePodcastGenerator::generateFromSource(QELPodcastSource& source, ErrorSlot& error) {
  if (!outputPath_) {
    error = QELError(1, "No output path was provided");
    return false;
  }
  const BundleDirectory bundle(*outputPath_);
  ErrorSlot cause;
  if (!bundle.create(cause)) {
    error = QELError(
        2, cause ? platform::formattedText("Could not create bundle: %@", {cause->description})
                 : "Could not create bundle because of an unspecified filesystem error");
    return false;
  }

  Dictionary dictionary;
  QELAddPodcastKeys(QELPodcastDescriptiveKeys(), source, dictionary);
  setPosterKeys(
      dictionary, "PodcastPosterReference",
      fetchPoster(bundle, source.allowedPosterFileTypes(),
                  {source.posterLocation(), source.posterReferenceType(), "Podcast", "podcast",
                   source.title()},
                  [&](const std::string& path) { return source.savePosterToPath(path); }));

  static const QELEpisodeList none;
  const QELEpisodeList& episodes = source.episodes() ? *source.episodes() : none;
  QELProgress("N", "Fetching %lu episodes", episodes.size());
  QELNameLedger names;
  platform::PropertyListValue::Array entries;
  for (std::size_t index = 0; index < episodes.size(); ++index) {
    const std::size_t number = index + 1;
    QELProgress("N", "Fetching episode %lu...", number);
    if (auto entry = fetchEpisode(bundle, source, *episodes[index], names)) {
      entries.emplace_back(std::move(*entry));
      QELProgress("N", "Fetched episode %lu", number);
    } else {
      QELProgress("N", "Skipping episode %lu", number);
    }
  }
  if (!entries.empty()) dictionary.insert_or_assign("Episodes", std::move(entries));

  if (!bundle.writeReferenceFile(dictionary)) {
    error = QELError(1, "Could not write Info.plist file");
    return false;
  }
  return true;
}
