#pragma once

#include <memory>
#include <optional>
#include <set>
#include <string>
#include <utility>

#include "model/QELEpisode.h"
#include "model/QELFetcher.h"
#include "model/QELMediaReference.h"
#include "platform/text/ErrorRecord.h"
#include "platform/text/Text.h"

/// A podcast: the fields of its channel and its episodes, which every generator reads; and the
/// abstract source, whose kinds fill those fields when they are loaded.
///
/// Every field is absent at first. A missing text is absent, distinct from an empty one. Used by
/// one thread.
///
///     const std::unique_ptr<QELPodcastSource> source = initWithSourceString("show.plist");
///     platform::ErrorSlot error;
///     if (!source->loadSourceWithError(error)) return fail(error->description);
///     for (const auto& episode : *source->episodes()) print(episode->title());
class QELPodcastSource : private QELFetcher {
 public:
  using OptionalText = platform::OptionalText;
  /// File-name extensions in lower case. Each of many episodes is looked up in what may be many.
  using FileTypes = std::set<std::string>;

  /// Fills the fields from wherever the source's kind reads them. On failure returns false with the
  /// slot filled, the fields as they were. The base, which has nothing to read, always fails with
  /// code 1.
  virtual bool loadSourceWithError(platform::ErrorSlot& error);

  /// Puts the podcast's poster at the path and returns once it is there or has failed (false). A
  /// local poster is copied, never over an existing file; a remote one is downloaded over whatever
  /// is there.
  bool savePosterToPath(const std::string& path) { return savePosterTo(path, posterReference()); }
  /// The same for the caller who has opened the directory, and already has `posterReference()`,
  /// since a name was made from it.
  bool savePosterTo(const platform::FilePlace& place, const QELMediaReference& poster);

  /// Where the poster lies, by `posterLocation` and `posterReferenceType` of this moment.
  QELMediaReference posterReference() const { return {posterLocation_, posterReferenceType_}; }

  const OptionalText& uuid() const { return uuid_; }
  void setUuid(OptionalText uuid) { uuid_ = std::move(uuid); }
  /// Also names the podcast in progress lines.
  const OptionalText& title() const { return title_; }
  void setTitle(OptionalText title) { title_ = std::move(title); }
  const OptionalText& author() const { return author_; }
  void setAuthor(OptionalText author) { author_ = std::move(author); }
  const OptionalText& copyright() const { return copyright_; }
  void setCopyright(OptionalText copyright) { copyright_ = std::move(copyright); }
  /// All keywords, in one text as the source gave it.
  const OptionalText& keywords() const { return keywords_; }
  void setKeywords(OptionalText keywords) { keywords_ = std::move(keywords); }
  const OptionalText& category() const { return category_; }
  void setCategory(OptionalText category) { category_ = std::move(category); }
  const OptionalText& podcastDescription() const { return description_; }
  void setPodcastDescription(OptionalText text) { description_ = std::move(text); }
  const OptionalText& advisoryLabel() const { return advisoryLabel_; }
  void setAdvisoryLabel(OptionalText label) { advisoryLabel_ = std::move(label); }

  /// "local" or "remote": the kind of `location`. Other texts can come from a reference file.
  const OptionalText& referenceType() const { return referenceType_; }
  void setReferenceType(OptionalText type) { referenceType_ = std::move(type); }
  /// Where the podcast came from or points to.
  const OptionalText& location() const { return location_; }
  void setLocation(OptionalText location) { location_ = std::move(location); }
  /// The same pair for the podcast's poster image: a path or a URL.
  const OptionalText& posterReferenceType() const { return posterReferenceType_; }
  void setPosterReferenceType(OptionalText type) { posterReferenceType_ = std::move(type); }
  const OptionalText& posterLocation() const { return posterLocation_; }
  void setPosterLocation(OptionalText location) { posterLocation_ = std::move(location); }

  /// The very list that was set; null when absent.
  const std::shared_ptr<const QELEpisodeList>& episodes() const { return episodes_; }
  void setEpisodes(std::shared_ptr<const QELEpisodeList> list) { episodes_ = std::move(list); }

  /// The file types that a bundle accepts for posters, and for the media of episodes; absent for
  /// all.
  const std::optional<FileTypes>& allowedPosterFileTypes() const { return allowedPosters_; }
  void setAllowedPosterFileTypes(std::optional<FileTypes> types) {
    allowedPosters_ = std::move(types);
  }
  const std::optional<FileTypes>& allowedEpisodeFileTypes() const { return allowedMedia_; }
  void setAllowedEpisodeFileTypes(std::optional<FileTypes> types) {
    allowedMedia_ = std::move(types);
  }

 private:
  OptionalText uuid_;
  OptionalText title_;
  OptionalText author_;
  OptionalText copyright_;
  OptionalText keywords_;
  OptionalText category_;
  OptionalText description_;
  OptionalText advisoryLabel_;
  OptionalText referenceType_;
  OptionalText location_;
  OptionalText posterReferenceType_;
  OptionalText posterLocation_;
  std::shared_ptr<const QELEpisodeList> episodes_;
  std::optional<FileTypes> allowedPosters_;
  std::optional<FileTypes> allowedMedia_;
};
