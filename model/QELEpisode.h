#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "model/QELFetch.h"
#include "platform/net/Download.h"
#include "platform/plist/PropertyListValue.h"
#include "platform/text/AtomicValue.h"
#include "platform/text/Text.h"
#include "platform/time/PointInTime.h"

/// One podcast episode, whatever source it came from.
///
/// A missing text or date is absent; an empty text is present and is written out. Each field's
/// getter and setter are atomic with respect to each other, and what a getter returns stays valid
/// whatever is set afterwards; no two fields are locked together. Episodes are shared between their
/// holders, never copied.
class QELEpisode : private platform::DownloadReceiver {
 public:
  /// The order of an episode that has none.
  static constexpr std::int64_t kNoOrder = -1;

  /// A new record with every text and date absent, content length 0 and order 0 (not kNoOrder: only
  /// a record made from a dictionary is known to have no order).
  static std::shared_ptr<QELEpisode> episode();
  /// A new record from an episode dictionary of a reference file ("EpisodeName", ...). A null
  /// dictionary gives a record with everything absent. A reference type that the dictionary lacks
  /// is derived from its location.
  static std::shared_ptr<QELEpisode> episodeWithDictionary(const platform::Dictionary* dictionary);
  /// A new record from a feed item dictionary of the feed parser ("title", ...), likewise.
  /// Reference types are always derived.
  static std::shared_ptr<QELEpisode> episodeWithFeedDictionary(
      const platform::Dictionary* dictionary);

  QELEpisode() = default;
  QELEpisode(const QELEpisode&) = delete;
  QELEpisode& operator=(const QELEpisode&) = delete;

  std::optional<platform::Text> uuid() const { return uuid_.load(); }
  void setUuid(std::optional<platform::Text> uuid) { uuid_.store(std::move(uuid)); }

  std::optional<platform::Text> title() const { return title_.load(); }
  void setTitle(std::optional<platform::Text> title) { title_.store(std::move(title)); }

  std::optional<platform::Text> author() const { return author_.load(); }
  void setAuthor(std::optional<platform::Text> author) { author_.store(std::move(author)); }

  /// The publication date.
  std::optional<platform::PointInTime> date() const { return date_.load(); }
  void setDate(std::optional<platform::PointInTime> date) { date_.store(date); }

  /// All keywords, in one text as the source gave it.
  std::optional<platform::Text> keywords() const { return keywords_.load(); }
  void setKeywords(std::optional<platform::Text> keywords) { keywords_.store(std::move(keywords)); }

  std::optional<platform::Text> episodeDescription() const { return episodeDescription_.load(); }
  void setEpisodeDescription(std::optional<platform::Text> description) {
    episodeDescription_.store(std::move(description));
  }

  std::optional<platform::Text> category() const { return category_.load(); }
  void setCategory(std::optional<platform::Text> category) { category_.store(std::move(category)); }

  /// "Explicit" or "Clean" when it comes from a feed; any text otherwise.
  std::optional<platform::Text> advisoryLabel() const { return advisoryLabel_.load(); }
  void setAdvisoryLabel(std::optional<platform::Text> label) {
    advisoryLabel_.store(std::move(label));
  }

  /// The position that the source gives the episode; negative means none.
  std::int64_t orvaneOrder() const { return orvaneOrder_.load(); }
  void setOrvaneOrder(std::int64_t order) { orvaneOrder_.store(order); }

  /// "local" or "remote": how `location` is fetched. Other texts can come from a reference file.
  std::optional<platform::Text> referenceType() const { return referenceType_.load(); }
  void setReferenceType(std::optional<platform::Text> type) {
    referenceType_.store(std::move(type));
  }

  /// Where the media is: a path when local, a URL when remote.
  std::optional<platform::Text> location() const { return location_.load(); }
  void setLocation(std::optional<platform::Text> location) { location_.store(std::move(location)); }

  /// The MIME type of the media.
  std::optional<platform::Text> contentType() const { return contentType_.load(); }
  void setContentType(std::optional<platform::Text> type) { contentType_.store(std::move(type)); }

  /// The size of the media in bytes; 0 means unknown.
  std::uint64_t contentLength() const { return contentLength_.load(); }
  void setContentLength(std::uint64_t length) { contentLength_.store(length); }

  /// The same as `referenceType` and `location`, for the episode's poster.
  std::optional<platform::Text> posterReferenceType() const { return posterReferenceType_.load(); }
  void setPosterReferenceType(std::optional<platform::Text> type) {
    posterReferenceType_.store(std::move(type));
  }
  std::optional<platform::Text> posterLocation() const { return posterLocation_.load(); }
  void setPosterLocation(std::optional<platform::Text> location) {
    posterLocation_.store(std::move(location));
  }

  /// A new episode dictionary as a reference file holds it. Absent fields, negative orders and a
  /// content length of 0 leave their key out.
  platform::Dictionary dictionary() const;

  /// For debugging: <QELEpisode: "title">.
  std::string description() const;

  /// Puts the episode's media at the path and returns once it is there or has failed (false). Local
  /// media are copied, never over an existing file; remote ones are downloaded over whatever is
  /// there, with a byte counter among the progress lines, and the size that the server announces
  /// becomes the content length.
  bool saveToPath(const std::string& path);

  /// The same for the episode's poster, without a counter. The size announced for a poster becomes
  /// the content length too.
  bool savePosterToPath(const std::string& path);

 private:
  using TextField = platform::AtomicValue<std::optional<platform::Text>>;

  void didReceiveResponse(platform::Download& download, std::int64_t expectedLength) override;
  void didReceiveDataOfLength(platform::Download& download, std::uint64_t length) override;
  void downloadDidFinish(platform::Download& download) override;
  void didFailWithError(platform::Download& download, const platform::ErrorRecord& error) override;

  void initWithDictionary(const platform::Dictionary* dictionary);
  void initWithFeedDictionary(const platform::Dictionary* dictionary);

  TextField uuid_;
  TextField title_;
  TextField author_;
  platform::AtomicValue<std::optional<platform::PointInTime>> date_;
  TextField keywords_;
  TextField episodeDescription_;
  TextField category_;
  TextField advisoryLabel_;
  std::atomic<std::int64_t> orvaneOrder_ = 0;
  TextField referenceType_;
  TextField location_;
  TextField contentType_;
  std::atomic<std::uint64_t> contentLength_ = 0;
  TextField posterReferenceType_;
  TextField posterLocation_;

  // Of the running download; used by the thread that waits for it alone.
  QELDownloadState download_;
  bool downloadingPoster_ = false;
  std::uint64_t totalDownloaded_ = 0;  // bytes since the last response
};

/// Episodes in the order of their source.
using QELEpisodeList = std::vector<std::shared_ptr<QELEpisode>>;
