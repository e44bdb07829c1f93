#include "generators/QELBundlePodcastGenerator.h"

#include <string_view>
#include <utility>

#include "cli/common/QELError.h"
#include "cli/common/QELProgress.h"
#include "cli/common/QELReferenceType.h"
#include "generators/QELBundleDirectory.h"
#include "generators/QELBundleNames.h"
#include "generators/QELNameLedger.h"
#include "model/QELPodcastKeys.h"
#include "platform/files/Paths.h"
#include "platform/text/Case.h"
#include "platform/text/FormattedText.h"
#include "platform/text/Text.h"

namespace {

using platform::Dictionary;
using platform::ErrorSlot;
using platform::Text;

bool allows(const std::optional<QELPodcastSource::FileTypes>& types, std::string_view extension) {
  return !types || types->contains(platform::lowercased(extension));
}

/// Warns about what is left out of the bundle; absent, as what is left out is.
template <typename... Arguments>
std::nullopt_t leftOut(std::string_view format, const Arguments&... arguments) {
  QELProgress("W", format, arguments...);
  return std::nullopt;
}

/// Fetches the poster of the record, the podcast or an episode, as the warnings call it. The
/// reference to it, relative to the bundle; absent without a poster and, after a warning, for one
/// that could not be fetched.
template <typename Record>
std::optional<std::string> fetchPoster(QELBundleDirectory& bundle, const QELPodcastSource& source,
                                       Record& record, std::string_view baseName,
                                       std::string_view subject) {
  const QELMediaReference reference = record.posterReference();
  if (!reference.location) return std::nullopt;
  const platform::OptionalText title = record.title();
  const std::optional<std::string> name = QELFileName(reference);
  const std::string_view extension = name ? platform::pathExtension(*name) : "";
  if (name && !allows(source.allowedPosterFileTypes(), extension)) {
    return leftOut("Unsupported poster image type \"%@\" for %@ \"%@\"", extension, subject, title);
  }
  const std::string posterName = QELNameWithExtension(baseName, extension);
  const auto place = name ? bundle.posterPlace(posterName) : std::nullopt;
  if (!place) {
    return leftOut("Could not generate sane path for poster image for %@ \"%@\"", subject, title);
  }
  if (!bundle.save(*place, [&] { return record.savePosterTo(*place, reference); })) {
    return leftOut("Could not save or download poster image for %@ \"%@\"", subject, title);
  }
  return platform::joinedPath(QELBundleDirectory::kPostersName, posterName);
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
std::optional<Dictionary> fetchEpisode(QELBundleDirectory& bundle, const QELPodcastSource& source,
                                       QELEpisode& episode, QELNameLedger& names) {
  const QELMediaReference media = episode.mediaReference();
  const platform::OptionalText title = episode.title();
  if (!media.location) {
    return leftOut("Found an episode (\"%@\") without a specified location", title);
  }
  const std::optional<std::string> name = QELFileName(media);
  if (!name) return leftOut("Could not generate sane path for episode \"%@\"", title);
  const std::string base = names.reserve(QELBaseName(*name));
  const std::string_view extension = platform::pathExtension(*name);
  if (!allows(source.allowedEpisodeFileTypes(), extension)) {
    return leftOut("Invalid file type \"%@\" for episode \"%@\"", extension, title);
  }
  const std::string mediaName = QELNameWithExtension(base, extension);
  const auto place = QELNamesFile(*name) ? bundle.mediaPlace(mediaName) : std::nullopt;
  if (!place) return leftOut("Could not generate sane path for episode \"%@\"", title);
  if (!bundle.save(*place, [&] { return episode.saveTo(*place, media); })) {
    return leftOut("Could not save or download episode \"%@\"", title);
  }
  const auto poster = fetchPoster(bundle, source, episode, base, "episode");

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
  QELBundleDirectory bundle;
  ErrorSlot cause;
  if (!bundle.open(*outputPath_, cause)) {
    error = QELError(
        2, cause ? platform::formattedText("Could not create bundle: %@", {cause->description})
                 : "Could not create bundle because of an unspecified filesystem error");
    return false;
  }

  Dictionary dictionary;
  QELAddPodcastKeys(QELPodcastDescriptiveKeys(), source, dictionary);
  setPosterKeys(dictionary, "PodcastPosterReference",
                fetchPoster(bundle, source, source, "Podcast", "podcast"));

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

  if (!bundle.writeReferenceFile(dictionary, cause)) {
    error = QELError(1, "Could not write Info.plist file");
    return false;
  }
  return true;
}
