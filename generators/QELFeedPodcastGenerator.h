#pragma once

#include <memory>
#include <optional>
#include <string>
#include <utility>

#include "generators/QELFeedStyle.h"
#include "generators/QELPodcastGenerator.h"
#include "model/QELEpisode.h"
#include "platform/text/Text.h"
#include "platform/xml/XMLWriter.h"

/// Turns a source into a feed document: RSS 2.0 with Dublin Core, podcast-directory ("orvane") and
/// the tool's own ("qel") elements; or, for "atom", a document without any element.
class QELFeedPodcastGenerator : public QELPodcastGenerator {
 public:
  /// Builds the document for `format`. An unknown format fails with code 2 and leaves `xmlData`
  /// alone.
  bool generateFromSource(QELPodcastSource& source, platform::ErrorSlot& error) override;

  /// "rss" or "atom", in lower case; "rss" at first.
  const platform::Text& format() const { return format_; }
  void setFormat(platform::Text format) { format_ = std::move(format); }

  /// Whether the channel gets a "pubDate" with the moment of generation; true at first.
  bool generatePubDate() const { return generatePubDate_; }
  void setGeneratePubDate(bool generate) { generatePubDate_ = generate; }

  /// The bytes of the last document that was generated; null before the first.
  const std::shared_ptr<const std::string>& xmlData() const { return xmlData_; }
  void setXmlData(std::shared_ptr<const std::string> data) { xmlData_ = std::move(data); }

  /// What the rows are written with; podcast-directory elements stand under "orvane" at first.
  const QELFeedStyle& style() const { return style_; }
  void setStyle(QELFeedStyle style) { style_ = std::move(style); }

 protected:
  /// What a derived generator writes besides; nothing here. Attributes of the root element:
  virtual void appendNamespaces(platform::XMLElement /*rss*/) const {}
  /// Behind the channel's own rows, before its items:
  virtual void appendToChannel(platform::XMLElement /*channel*/,
                               const QELPodcastSource& /*source*/) const {}
  /// Behind the rows of each item:
  virtual void appendToItem(platform::XMLElement /*item*/, const QELEpisode& /*episode*/) const {}

 private:
  void addRSS(platform::XMLWriter& document, const QELPodcastSource& source) const;

  platform::Text format_ = "rss";
  std::shared_ptr<const std::string> xmlData_;
  bool generatePubDate_ = true;
  QELFeedStyle style_;
};

/// Appends the children that describe the podcast to a "channel" element. With `stampNow` there is
/// a "pubDate" that holds the current time; a podcast has no date of its own.
void QELPopulateRSSElementFromItem(platform::XMLElement element, const QELPodcastSource& item,
                                   bool stampNow, const QELFeedStyle& style);

/// Appends the children that describe the episode to an "item" element. "pubDate" is the episode's
/// date or, with `stampNow`, the current time.
void QELPopulateRSSElementFromItem(platform::XMLElement element, const QELEpisode& item,
                                   bool stampNow, const QELFeedStyle& style);

/// Where Atom output would go. Does nothing, and nothing calls it.
void QELPopulateAtomElementFromItem(platform::XMLElement element, const QELPodcastSource& item);
void QELPopulateAtomElementFromItem(platform::XMLElement element, const QELEpisode& item);
