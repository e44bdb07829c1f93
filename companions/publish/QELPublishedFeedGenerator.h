#pragma once

#include <optional>
#include <string>
#include <utility>

#include "generators/QELFeedPodcastGenerator.h"

/// Writes a feed as readers and podcast directories want it: besides what createfeed writes, the
/// channel has "language" and "atom:link" (RFC 4287) where they are set, and every item that can be
/// told from the others a "guid". Dates are English and end in "GMT", whatever the environment.
class QELPublishedFeedGenerator : public QELFeedPodcastGenerator {
 public:
  /// With a stamp, that is the date of the channel; else the current time is.
  QELPublishedFeedGenerator(QELDirectory directory, std::optional<platform::PointInTime> stamp);

  /// A tag of RFC 5646: "en", "pt-BR".
  void setLanguage(std::optional<std::string> tag) { language_ = std::move(tag); }
  /// Where the feed itself will be.
  void setSelfURL(std::optional<std::string> url) { selfURL_ = std::move(url); }

  /// What tells the episode from all others: its uuid, else the location of its media; absent
  /// without both, and blank texts are none.
  static std::optional<platform::Text> guidOf(const QELEpisode& episode);

 protected:
  void appendNamespaces(platform::XMLElement rss) const override;
  void appendToChannel(platform::XMLElement channel, const QELPodcastSource& source) const override;
  void appendToItem(platform::XMLElement item, const QELEpisode& episode) const override;

 private:
  std::optional<std::string> language_;
  std::optional<std::string> selfURL_;
};
