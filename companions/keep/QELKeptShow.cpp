#include "companions/keep/QELKeptShow.h"

#include <algorithm>
#include <array>
#include <set>
#include <utility>

#include "generators/QELBundleNames.h"
#include "model/QELEpisodeMatching.h"
#include "model/QELPodcastKeys.h"
#include "platform/files/Paths.h"
#include "platform/text/FormattedText.h"
#include "platform/xml/XMLEscaping.h"

namespace {

using platform::Dictionary;
using platform::OptionalText;
using platform::PropertyListValue;
using platform::Text;

/// Of the keys of an entry, those of the files that the bundle has for it.
constexpr std::array<std::string_view, 5> kFileKeys = {"EpisodeFileSize", "EpisodePosterReference",
                                                       "EpisodePosterReferenceType",
                                                       "EpisodeReference", "EpisodeReferenceType"};

std::string quoted(const OptionalText& title, const OptionalText& otherwise) {
  const OptionalText& text = title ? title : otherwise;
  return platform::formattedText("\"%@\"", {text.value_or(platform::Text())});
}

void setFile(Dictionary& dictionary, const std::string& key, const std::string& reference) {
  dictionary.insert_or_assign(key, reference);
  dictionary.insert_or_assign(key + "Type", Text(kReferenceTypeLocal));
}

bool isDone(const std::shared_ptr<QELFetch>& fetch) {
  return fetch && fetch->state() == QELFetch::State::kDone;
}

}  // namespace

QELKeptShow::QELKeptShow(const Dictionary& kept, const QELBundleDirectory& directory,
                         const std::string& path)
    : directory_(directory),
      path_(path),
      postersPath_(platform::joinedPath(path, QELBundleDirectory::kPostersName)) {
  podcast_.dictionary = kept;
  podcast_.dictionary.erase("Episodes");
  const PropertyListValue* episodes = platform::valueForKey(kept, "Episodes");
  if (episodes == nullptr || episodes->asArray() == nullptr) return;
  for (const PropertyListValue& value : *episodes->asArray()) {
    if (value.asDictionary()) entries_.push_back({*value.asDictionary(), true, false, {}, {}});
  }
}

void QELKeptShow::update(const QELPodcastSource& source, const std::string& origin,
                         const std::vector<bool>& isWanted, bool allowsLocalFiles) {
  allowsLocalFiles_ = allowsLocalFiles;
  static const QELEpisodeList none;
  const QELEpisodeList& episodes = source.episodes() ? *source.episodes() : none;
  std::vector<QELEpisodeIdentity> kept;
  for (const Entry& entry : entries_) kept.push_back(QELIdentityOf(entry.dictionary));
  const auto matches = QELMatchedEpisodes(QELIdentitiesOf(episodes), kept);
  std::vector<bool> isCurrent(entries_.size());
  for (const auto& match : matches) {
    if (match) isCurrent[*match] = true;
  }

  mediaNames_.take(QELBundleDirectory::kReferenceFileName);
  mediaNames_.takeAllOf(path_);
  posterNames_.takeAllOf(postersPath_);
  notePoster(podcast_, "Podcast");
  for (std::size_t index = 0; index < entries_.size(); ++index) {
    noteFiles(entries_[index], isCurrent[index]);
  }

  QELAddPodcastKeys(QELPodcastDescriptiveKeys(), source, podcast_.dictionary);
  podcast_.dictionary.insert_or_assign("PodcastOrigin", origin);
  updatePoster(podcast_, "Podcast", source.posterReference(), quoted(source.title(), origin),
               "Podcast");
  std::vector<Entry> updated(episodes.size());
  // A file that is gone gets its name back before a new one takes it.
  for (const bool isKept : {true, false}) {
    for (std::size_t index = 0; index < episodes.size(); ++index) {
      if (matches[index].has_value() != isKept) continue;
      if (isKept) updated[index] = std::move(entries_[*matches[index]]);
      if (isKept || isWanted[index]) updateEntry(updated[index], *episodes[index]);
    }
  }
  for (std::size_t index = 0; index < entries_.size(); ++index) {
    if (isCurrent[index]) continue;
    if (!entries_[index].isThere) lose(entries_[index]);
    updated.push_back(std::move(entries_[index]));
  }
  entries_ = std::move(updated);

  std::set<const QELFetch*> collected;  // posters may be shared
  const auto collect = [&](const std::shared_ptr<QELFetch>& fetch) {
    if (fetch && collected.insert(fetch.get()).second) fetches_.push_back(fetch);
  };
  collect(podcast_.poster);
  for (const Entry& entry : entries_) {
    collect(entry.media);
    collect(entry.poster);
  }
}

/// Notes what is there of an entry, and which names that leaves. One that is gone is to have its
/// name again, where the source has it.
void QELKeptShow::noteFiles(Entry& entry, bool isCurrent) {
  const OptionalText reference = platform::textForKey(entry.dictionary, "EpisodeReference");
  const auto size = QELBundleDirectory::sizeOfFile(path_, reference);
  if (size) {
    entry.isThere = true;
    entry.dictionary.insert_or_assign("EpisodeFileSize", *size);
  }
  if (reference && (size || !isCurrent)) mediaNames_.take(platform::lastPathComponent(*reference));
  notePoster(entry, "Episode");
}

void QELKeptShow::notePoster(const Entry& entry, const std::string& prefix) {
  const OptionalText reference = platform::textForKey(entry.dictionary, prefix + "PosterReference");
  if (!reference) return;
  posterNames_.take(platform::lastPathComponent(*reference));
  const OptionalText origin = platform::textForKey(entry.dictionary, prefix + "PosterOrigin");
  if (!origin || !QELBundleDirectory::sizeOfFile(path_, reference)) return;
  posters_.emplace(origin->view(), reference->view());
}

/// Takes over what the source says; what it does not say stays.
void QELKeptShow::updateEntry(Entry& entry, const QELEpisode& episode) {
  for (const auto& [key, value] : episode.dictionary()) {
    if (std::ranges::find(kFileKeys, key.view()) != kFileKeys.end()) continue;
    entry.dictionary.insert_or_assign(key, value);
  }
  const OptionalText location = episode.location();
  if (location) entry.dictionary.insert_or_assign("EpisodeOrigin", *location);
  const std::string title = quoted(episode.title(), location);
  OptionalText reference = platform::textForKey(entry.dictionary, "EpisodeReference");
  if (entry.isThere) {
    ++knownCount_;
  } else if (location) {
    const QELMediaReference media = episode.mediaReference();
    const std::string old = reference ? reference->string() : QELFileName(media).value_or("");
    const std::string base = QELBaseName(platform::lastPathComponent(old));
    const std::string name = mediaNames_.reserve(base, platform::pathExtension(old));
    entry.media = std::make_shared<QELFetch>(title, media, directory_.mediaPlace(name), path_,
                                             allowsLocalFiles_, episode.uuid().value_or(Text()));
    reference = name;
  } else if (reference) {
    lose(entry);
  } else {
    ++emptyCount_;
    return;
  }
  updatePoster(entry, "Episode", episode.posterReference(), title,
               platform::pathWithoutExtension(platform::lastPathComponent(*reference)));
}

void QELKeptShow::lose(const Entry& entry) {
  lostTitles_.push_back(quoted(platform::textForKey(entry.dictionary, "EpisodeName"),
                               platform::textForKey(entry.dictionary, "EpisodeReference")));
}

/// Has a poster fetched that the bundle does not have. One of unknown origin, as other programs put
/// it there, is taken for the source's.
void QELKeptShow::updatePoster(Entry& entry, const std::string& prefix,
                               const QELMediaReference& poster, const std::string& title,
                               std::string_view baseName) {
  if (!poster.location || poster.location->empty()) return;
  // Nobody lists the poster of an episode that does not come.
  const bool isNew = entry.media && !entry.wasListed;
  if (isNew && entry.media->state() == QELFetch::State::kFailed) return;
  const std::string key = prefix + "PosterReference";
  const std::string originKey = prefix + "PosterOrigin";
  const std::string origin = platform::textReadBack(*poster.location);
  const OptionalText oldOrigin = platform::textForKey(entry.dictionary, originKey);
  const OptionalText old = platform::textForKey(entry.dictionary, key);
  const bool isThere = QELBundleDirectory::sizeOfFile(path_, old).has_value();
  if (isThere && (!oldOrigin || *oldOrigin == origin)) {
    entry.dictionary.insert_or_assign(originKey, origin);
  } else if (const auto found = posters_.find(origin); found != posters_.end()) {
    setFile(entry.dictionary, key, found->second);
    entry.dictionary.insert_or_assign(originKey, origin);
  } else {
    std::shared_ptr<QELFetch>& fetch = newPosters_[origin];
    if (!fetch) {
      const std::string extension(platform::pathExtension(QELFileName(poster).value_or("")));
      const std::string name = posterNames_.reserve(baseName, extension);
      fetch = std::make_shared<QELFetch>("poster of " + title, poster, directory_.posterPlace(name),
                                         postersPath_, allowsLocalFiles_);
      if (isNew) fetch->hold();
    }
    if (isNew) entry.media->setFollower(fetch);
    entry.poster = fetch;
  }
}

Dictionary QELKeptShow::dictionary() const {
  const auto current = [](const Entry& entry, const std::string& prefix) {
    Dictionary dictionary = entry.dictionary;
    if (isDone(entry.poster)) {
      setFile(dictionary, prefix + "PosterReference",
              platform::joinedPath(QELBundleDirectory::kPostersName, entry.poster->name()));
      dictionary.insert_or_assign(prefix + "PosterOrigin", *entry.poster->reference().location);
    }
    return dictionary;
  };
  Dictionary whole = current(podcast_, "Podcast");
  PropertyListValue::Array episodes;
  for (const Entry& entry : entries_) {
    if (!entry.wasListed && !isDone(entry.media)) continue;
    Dictionary dictionary = current(entry, "Episode");
    if (isDone(entry.media)) {
      setFile(dictionary, "EpisodeReference", entry.media->name());
      dictionary.insert_or_assign("EpisodeFileSize", entry.media->size());
    }
    episodes.emplace_back(std::move(dictionary));
  }
  if (!episodes.empty()) whole.insert_or_assign("Episodes", std::move(episodes));
  return whole;
}

void QELKeptShow::removeParts() const {
  std::set<std::string> names;
  for (const auto& fetch : fetches_) names.insert(fetch->partName());
  QELPart::removeAllBut(names, directory_.directory(), path_);
  QELPart::removeAllBut(names, directory_.posters(), postersPath_);
}

std::size_t QELKeptShow::newCount() const {
  return static_cast<std::size_t>(
      std::ranges::count_if(entries_, [](const Entry& entry) { return isDone(entry.media); }));
}
