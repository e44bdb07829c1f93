#pragma once

#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "cli/common/QELDirectory.h"
#include "model/QELPodcastSource.h"
#include "platform/net/URL.h"

/// A podcast source that reads an RSS feed from a URL (http, https, file:).
class QELFeedPodcastSource : public QELPodcastSource {
 public:
  /// A source for the feed at the URL, which is not fetched yet; null for an absent URL.
  static std::unique_ptr<QELFeedPodcastSource> initWithURL(std::optional<platform::URL> url);

  explicit QELFeedPodcastSource(std::optional<platform::URL> feedURL)
      : feedURL_(std::move(feedURL)) {}

  /// The prefixes under which the feed's podcast-directory elements are read; "orvane" alone at
  /// first.
  void setDirectoryPrefixes(std::vector<std::string> prefixes) {
    directoryPrefixes_ = std::move(prefixes);
  }

  /// The number of seconds without a byte after which the fetching fails; 0, for never, at first.
  void setStallLimit(int stallLimit) { stallLimit_ = stallLimit; }

  /// Fetches and parses the whole feed and fills the fields from it; what the feed lacks becomes
  /// absent. A feed does not say where it lies, so `location` is always absent afterwards. On
  /// failure the fields are as they were and the slot holds the read's, the XML parser's or the
  /// tool's own record.
  bool loadSourceWithError(platform::ErrorSlot& error) override;

 private:
  std::optional<platform::URL> feedURL_;
  int stallLimit_ = 0;
  std::vector<std::string> directoryPrefixes_{QELDirectory().prefix};
};
