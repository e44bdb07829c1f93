#pragma once

#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "model/QELEpisode.h"
#include "model/QELFetch.h"
#include "platform/net/Download.h"
#include "platform/text/ErrorRecord.h"
#include "platform/text/Text.h"

/// A podcast: the fields of its channel and its episodes, which every generator reads; and the
/// abstract source, whose kinds fill those fields when they are loaded.
///
/// Every field is absent at first. A missing text is absent, distinct from an empty one. Used by
/// one thread.
class QELPodcastSource : private platform::DownloadReceiver {
 public:
  /// File-name extensions in lower case.
  using FileTypes = std::vector<std::string>;

  QELPodcastSource() = default;
  ~QELPodcastSource() override = default;
  QELPodcastSource(const QELPodcastSource&) = delete;
  QELPodcastSource& operator=(const QELPodcastSource&) = delete;

  /// Fills the fields from wherever the source's kind reads them. On failure returns false with the
  /// slot filled, the fields as they were. The base, which has nothing to read, always fails with
  /// code 1.
  virtual bool loadSourceWithError(platform::ErrorSlot& error);

  /// Puts the podcast's poster at the path and returns once it is there or has failed (false). A
  /// local poster is copied, never over an existing file; a remote one is downloaded over whatever
  /// is there.
  bool savePosterToPath(const std::string& path);

  const std::optional<platform::Text>& uuid() const { return uuid_; }
  void setUuid(std::optional<platform::Text> uuid) { uuid_ = std::move(uuid); }

  /// Also names the podcast in progress lines.
  const std::optional<platform::Text>& title() const { return title_; }
  void setTitle(std::optional<platform::Text> title) { title_ = std::move(title); }

  const std::optional<platform::Text>& author() const { return author_; }
  void setAuthor(std::optional<platform::Text> author) { author_ = std::move(author); }

  const std::optional<platform::Text>& copyright() const { return copyright_; }
  void setCopyright(std::optional<platform::Text> copyright) { copyright_ = std::move(copyright); }

  /// All keywords, in one text as the source gave it.
  const std::optional<platform::Text>& keywords() const { return keywords_; }
  void setKeywords(std::optional<platform::Text> keywords) { keywords_ = std::move(keywords); }

  const std::optional<platform::Text>& category() const { return category_; }
  void setCategory(std::optional<platform::Text> category) { category_ = std::move(category); }

  const std::optional<platform::Text>& podcastDescription() const { return description_; }
  void setPodcastDescription(std::optional<platform::Text> description) {
    description_ = std::move(description);
  }

  const std::optional<platform::Text>& advisoryLabel() const { return advisoryLabel_; }
  void setAdvisoryLabel(std::optional<platform::Text> label) { advisoryLabel_ = std::move(label); }

  /// "local" or "remote": the kind of `location`. Other texts can come from a reference file.
  const std::optional<platform::Text>& referenceType() const { return referenceType_; }
  void setReferenceType(std::optional<platform::Text> type) { referenceType_ = std::move(type); }

  /// Where the podcast came from or points to.
  const std::optional<platform::Text>& location() const { return location_; }
  void setLocation(std::optional<platform::Text> location) { location_ = std::move(location); }

  /// The same pair for the podcast's poster image: a path or a URL.
  const std::optional<platform::Text>& posterReferenceType() const { return posterReferenceType_; }
  void setPosterReferenceType(std::optional<platform::Text> type) {
    posterReferenceType_ = std::move(type);
  }
  const std::optional<platform::Text>& posterLocation() const { return posterLocation_; }
  void setPosterLocation(std::optional<platform::Text> location) {
    posterLocation_ = std::move(location);
  }

  /// The very list that was set; null when absent.
  const std::shared_ptr<const QELEpisodeList>& episodes() const { return episodes_; }
  void setEpisodes(std::shared_ptr<const QELEpisodeList> episodes) {
    episodes_ = std::move(episodes);
  }

  /// The file types that a bundle accepts for posters; absent for all.
  const std::optional<FileTypes>& allowedPosterFileTypes() const { return allowedPosterFileTypes_; }
  void setAllowedPosterFileTypes(std::optional<FileTypes> types) {
    allowedPosterFileTypes_ = std::move(types);
  }

  /// The same for the media of episodes.
  const std::optional<FileTypes>& allowedEpisodeFileTypes() const {
    return allowedEpisodeFileTypes_;
  }
  void setAllowedEpisodeFileTypes(std::optional<FileTypes> types) {
    allowedEpisodeFileTypes_ = std::move(types);
  }

 private:
  void downloadDidFinish(platform::Download& download) override;
  void didFailWithError(platform::Download& download, const platform::ErrorRecord& error) override;

  std::optional<platform::Text> uuid_;
  std::optional<platform::Text> title_;
  std::optional<platform::Text> author_;
  std::optional<platform::Text> copyright_;
  std::optional<platform::Text> keywords_;
  std::optional<platform::Text> category_;
  std::optional<platform::Text> description_;
  std::optional<platform::Text> advisoryLabel_;
  std::optional<platform::Text> referenceType_;
  std::optional<platform::Text> location_;
  std::optional<platform::Text> posterReferenceType_;
  std::optional<platform::Text> posterLocation_;
  std::shared_ptr<const QELEpisodeList> episodes_;
  std::optional<FileTypes> allowedPosterFileTypes_;
  std::optional<FileTypes> allowedEpisodeFileTypes_;
  QELDownloadState download_;  // of the running poster download
};
