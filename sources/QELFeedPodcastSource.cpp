#include "sources/QELFeedPodcastSource.h"

#include <string>
#include <string_view>
#include <utility>

#include "cli/common/QELError.h"
#include "cli/common/QELReferenceType.h"
#include "model/QELPodcastKeys.h"
#include "platform/net/ResourceReader.h"
#include "platform/plist/PropertyListValue.h"
#include "sources/FeedParser.h"

namespace {

/// What a failing service said, or the tool's own record where it said nothing.
void fillSlot(platform::ErrorSlot& error, platform::ErrorSlot said, const char* otherwise) {
  error = said ? std::move(said) : QELError(3, otherwise);
}

}  // namespace

std::unique_ptr<QELFeedPodcastSource> QELFeedPodcastSource::initWithURL(
    std::optional<platform::URL> url) {
  if (!url) return nullptr;
  return std::make_unique<QELFeedPodcastSource>(std::move(url));
}

bool QELFeedPodcastSource::loadSourceWithError(platform::ErrorSlot& error) {
  if (!feedURL_) {
    error = QELError(1, "No feed URL provided");
    return false;
  }

  platform::ErrorSlot said;
  std::optional<platform::ByteSource> bytes =
      platform::readResource(*feedURL_, said, platform::kWholeReadLimit, stallLimit_);
  if (!bytes || bytes->head(said).empty()) {
    fillSlot(error, std::move(said), "Could not load or read the specified feed URL");
    return false;
  }
  const std::unique_ptr<FeedParser> parser = FeedParser::parserWithFeedData(std::move(bytes));
  parser->setDirectoryPrefixes(directoryPrefixes_);
  auto episodes = std::make_shared<QELEpisodeList>();
  parser->setItemReceiver([&episodes](const platform::Dictionary& item) {
    episodes->push_back(QELEpisode::episodeWithFeedDictionary(&item));
  });
  if (!parser->parseWithError(said)) {
    fillSlot(error, std::move(said), "Could not parse the feed at the specified URL");
    return false;
  }

  for (const QELPodcastKey& field : QELPodcastKeys()) {
    (this->*field.setValue)(field.feedKey.empty()
                                ? std::nullopt
                                : platform::textForKey(parser->feedAttributes(), field.feedKey));
  }
  setReferenceType(QELReferenceType(location()));
  setPosterReferenceType(QELReferenceType(posterLocation()));
  setEpisodes(std::move(episodes));
  return true;
}
