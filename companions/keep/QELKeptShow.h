#pragma once

#include <cstddef>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "companions/transfers/QELFetch.h"
#include "generators/QELBundleDirectory.h"
#include "generators/QELFreeNames.h"
#include "model/QELPodcastSource.h"
#include "platform/plist/PropertyListValue.h"

/// A show in its bundle: what was kept, what the source says now, and what is to be fetched.
///
/// The bundle's reference file has PodcastOrigin (the source), and EpisodeOrigin,
/// PodcastPosterOrigin and EpisodePosterOrigin (where a file came from), which other readers
/// ignore.
class QELKeptShow {
 public:
  using Fetches = std::vector<std::shared_ptr<QELFetch>>;

  /// `kept` is the reference dictionary of the bundle at the path, empty for a new one; `directory`
  /// is that bundle, not open when nothing is to be fetched. All must outlive this.
  QELKeptShow(const platform::Dictionary& kept, const QELBundleDirectory& directory,
              const std::string& path);

  /// Brings the show up to date with what the loaded source says, whose name is to be remembered.
  /// Of the new episodes the wanted ones alone are taken. Local files are fetched only where they
  /// are allowed.
  void update(const QELPodcastSource& source, const std::string& origin,
              const std::vector<bool>& isWanted, bool allowsLocalFiles);

  /// What is to be fetched, in the order of the source.
  const Fetches& fetches() const { return fetches_; }
  /// How many episodes of the source were there already, have come, and have no media.
  std::size_t knownCount() const { return knownCount_; }
  std::size_t newCount() const;
  std::size_t emptyCount() const { return emptyCount_; }
  /// The titles of the kept episodes whose file is gone and cannot be had again.
  const std::vector<std::string>& lostTitles() const { return lostTitles_; }

  /// Removes the parts that are left, but those of what is still to be fetched, or to be listed.
  void removeParts() const;

  /// The reference dictionary of this moment. It lists what is whole, and what was listed before,
  /// also while its file is gone: nothing else would tell of that.
  platform::Dictionary dictionary() const;

 private:
  /// One entry of a reference file, the podcast's own or an episode's.
  struct Entry {
    platform::Dictionary dictionary;
    bool wasListed = false;
    bool isThere = false;              // its file
    std::shared_ptr<QELFetch> media;   // null when it is not fetched
    std::shared_ptr<QELFetch> poster;  // likewise; may be that of several entries
  };

  void noteFiles(Entry& entry, bool isCurrent);
  void notePoster(const Entry& entry, const std::string& prefix);
  void updateEntry(Entry& entry, const QELEpisode& episode);
  void updatePoster(Entry& entry, const std::string& prefix, const QELMediaReference& poster,
                    const std::string& title, std::string_view baseName);
  void lose(const Entry& entry);

  const QELBundleDirectory& directory_;
  const std::string& path_;
  std::string postersPath_;
  bool allowsLocalFiles_ = false;
  QELFreeNames mediaNames_;
  QELFreeNames posterNames_;
  std::map<std::string, std::string> posters_;  // references of those that are there, by origins
  std::map<std::string, std::shared_ptr<QELFetch>> newPosters_;  // by origins
  Entry podcast_;
  std::vector<Entry> entries_;
  Fetches fetches_;
  std::size_t knownCount_ = 0;
  std::size_t emptyCount_ = 0;
  std::vector<std::string> lostTitles_;
};
