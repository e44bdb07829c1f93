#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "model/QELFetcher.h"
#include "model/QELMediaReference.h"
#include "platform/plist/PropertyListValue.h"
#include "platform/text/AtomicTexts.h"
#include "platform/text/AtomicValue.h"
#include "platform/text/Text.h"
#include "platform/time/PointInTime.h"

/// One podcast episode, whatever source it came from.
///
/// A missing text or date is absent; an empty text is present and is written out. Each field's
/// getter and setter are atomic with respect to each other, and what a getter returns stays valid
/// whatever is set afterwards; no two fields are locked together. Episodes are shared between their
/// holders, never copied.
///
///     const platform::Dictionary item{{"title", "Pilot"}, {"url", "https://a.example/1.mp3"}};
///     const auto episode = QELEpisode::episodeWithFeedDictionary(&item);
///     episode->referenceType();                     // "remote", derived from the location
///     if (!episode->saveToPath("1.mp3")) return;    // downloads it
///     episode->dictionary();                        // "EpisodeName", "EpisodeReference", ...
class QELEpisode : private QELFetcher {
 public:
  using OptionalText = platform::OptionalText;
  using OptionalDate = std::optional<platform::PointInTime>;

  /// The order of an episode that has none.
  static constexpr std::int64_t kNoOrder = -1;

  /// A new record with every text and date absent, content length 0 and order 0 (not kNoOrder: only
  /// a record made from a dictionary is known to have no order).
  static std::shared_ptr<QELEpisode> episode() { return std::make_shared<QELEpisode>(); }
  /// A new record from an episode dictionary of a reference file ("EpisodeName", ...). A null
  /// dictionary gives a record with everything absent. A reference type that the dictionary lacks
  /// is derived from its location.
  static std::shared_ptr<QELEpisode> episodeWithDictionary(const platform::Dictionary* dictionary);
  /// A new record from a feed item dictionary of the feed parser ("title", ...), likewise.
  /// Reference types are always derived.
  static std::shared_ptr<QELEpisode> episodeWithFeedDictionary(
      const platform::Dictionary* dictionary);

  OptionalText uuid() const { return texts_.load(kUUID); }
  void setUuid(OptionalText uuid) { texts_.store(kUUID, std::move(uuid)); }
  OptionalText title() const { return texts_.load(kTitle); }
  void setTitle(OptionalText title) { texts_.store(kTitle, std::move(title)); }
  OptionalText author() const { return texts_.load(kAuthor); }
  void setAuthor(OptionalText author) { texts_.store(kAuthor, std::move(author)); }
  /// The publication date.
  OptionalDate date() const { return date_.load(); }
  void setDate(OptionalDate date) { date_.store(date); }
  /// All keywords, in one text as the source gave it.
  OptionalText keywords() const { return texts_.load(kKeywords); }
  void setKeywords(OptionalText keywords) { texts_.store(kKeywords, std::move(keywords)); }
  OptionalText episodeDescription() const { return texts_.load(kDescription); }
  void setEpisodeDescription(OptionalText text) { texts_.store(kDescription, std::move(text)); }
  OptionalText category() const { return texts_.load(kCategory); }
  void setCategory(OptionalText category) { texts_.store(kCategory, std::move(category)); }
  /// "Explicit" or "Clean" when it comes from a feed; any text otherwise.
  OptionalText advisoryLabel() const { return texts_.load(kAdvisoryLabel); }
  void setAdvisoryLabel(OptionalText label) { texts_.store(kAdvisoryLabel, std::move(label)); }

  /// The position that the source gives the episode, "qel:order" in a feed; negative means none. It
  /// is only carried along: episodes stay in the order of their source.
  std::int64_t orvaneOrder() const { return orvaneOrder_.load(); }
  void setOrvaneOrder(std::int64_t order) { orvaneOrder_.store(order); }

  /// "local" or "remote": how `location` is fetched. Other texts can come from a reference file.
  OptionalText referenceType() const { return texts_.load(kReferenceType); }
  void setReferenceType(OptionalText type) { texts_.store(kReferenceType, std::move(type)); }
  /// Where the media is: a path when local, a URL when remote.
  OptionalText location() const { return texts_.load(kLocation); }
  void setLocation(OptionalText location) { texts_.store(kLocation, std::move(location)); }
  /// The MIME type of the media.
  OptionalText contentType() const { return texts_.load(kContentType); }
  void setContentType(OptionalText type) { texts_.store(kContentType, std::move(type)); }
  /// The size of the media in bytes; 0 means unknown.
  std::uint64_t contentLength() const { return contentLength_.load(); }
  void setContentLength(std::uint64_t length) { contentLength_.store(length); }
  /// The same as `referenceType` and `location`, for the episode's poster.
  OptionalText posterReferenceType() const { return texts_.load(kPosterReferenceType); }
  void setPosterReferenceType(OptionalText type) {
    texts_.store(kPosterReferenceType, std::move(type));
  }
  OptionalText posterLocation() const { return texts_.load(kPosterLocation); }
  void setPosterLocation(OptionalText location) {
    texts_.store(kPosterLocation, std::move(location));
  }

  /// A new episode dictionary as a reference file holds it. Absent fields, negative orders and a
  /// content length of 0 leave their key out.
  platform::Dictionary dictionary() const;

  /// For debugging: <QELEpisode: "title">.
  std::string description() const;

  /// Where the media and the poster lie, by the fields of this moment.
  QELMediaReference mediaReference() const { return {location(), referenceType()}; }
  QELMediaReference posterReference() const { return {posterLocation(), posterReferenceType()}; }

  /// Puts the episode's media at the path and returns once it is there or has failed (false). Local
  /// media are copied, never over an existing file; remote ones are downloaded over whatever is
  /// there, with a byte counter among the progress lines, and the size that the server announces
  /// becomes the content length.
  bool saveToPath(const std::string& path) { return saveTo(path, mediaReference()); }
  /// The same for the episode's poster, without a counter. The size announced for a poster becomes
  /// the content length too.
  bool savePosterToPath(const std::string& path) { return savePosterTo(path, posterReference()); }
  /// The same for the caller who has opened the directory, and already has the reference, since a
  /// name was made from it.
  bool saveTo(const platform::FilePlace& place, const QELMediaReference& media);
  bool savePosterTo(const platform::FilePlace& place, const QELMediaReference& poster);

 private:
  enum TextField : std::size_t {
    kAdvisoryLabel,
    kAuthor,
    kCategory,
    kDescription,
    kKeywords,
    kTitle,
    kPosterLocation,
    kPosterReferenceType,
    kLocation,
    kReferenceType,
    kContentType,
    kUUID,
    kTextCount,
  };
  using Texts = platform::AtomicTexts<kTextCount>;

  enum class Keys { kOfReferenceFile, kOfFeedItem };
  void initWithDictionary(const platform::Dictionary* dictionary, Keys keys);
  template <typename Episode, typename Visit>
  static void forEachField(Episode& episode, Visit visit);

  void didReceiveResponse(platform::Download& download, std::int64_t expectedLength) override;
  void didReceiveDataOfLength(platform::Download& download, std::uint64_t length) override;

  // Of the running download; used by the thread that waits for it alone. Here it takes no room.
  bool downloadingPoster_ = false;
  // A feed may have a record for every seven bytes, so what is absent takes no room.
  Texts texts_;
  platform::AtomicValue<OptionalDate> date_;
  std::atomic<std::int64_t> orvaneOrder_ = 0;
  std::atomic<std::uint64_t> contentLength_ = 0;

  std::uint64_t totalDownloaded_ = 0;  // of the running download: bytes since the response
};

/// Episodes in the order of their source.
using QELEpisodeList = std::vector<std::shared_ptr<QELEpisode>>;
