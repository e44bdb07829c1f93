#pragma once

#include <cstddef>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "cli/common/QELDirectory.h"
#include "platform/plist/PropertyListValue.h"
#include "platform/text/ErrorRecord.h"
#include "platform/text/Text.h"
#include "platform/xml/XMLParser.h"

/// Turns the bytes of a podcast feed into two plain results: the feed attributes (one dictionary
/// for the channel) and the episodes (a feed item dictionary for each "item").
///
/// It understands RSS 2.0 with the podcast-directory elements (prefix "orvane", unless it is told
/// others), Dublin Core's
/// creator and the tool's own elements (prefix "qel"). It is deliberately shallow: it knows whether
/// it is inside an item or an image and no more, goes by local names (a few by the qualified name
/// as written), and keeps the text of the most recent text-bearing element in one buffer that all
/// elements share. Texts are kept exactly as they stand, white space included.
///
/// Keys of both dictionaries, each absent when its element never came: "title", "author",
/// "description", "copyright", "keywords", "category", "poster", "QELUUID" and "order" (texts),
/// "advisoryLabel" ("Explicit" or "Clean"), "date" (a point in time); items also have "url",
/// "contentType" (texts) and "contentLength" (an integer over 0). "order" is what "qel:order"
/// holds: the number that becomes the episode's orvaneOrder. It never changes the order of the
/// episodes.
///
/// Made for one feed, parsed once, read and dropped:
///
///     const auto parser = FeedParser::parserWithFeedData(std::move(bytes));
///     if (!parser->parseWithError(error)) return false;
///     platform::textForKey(parser->feedAttributes(), "title");  // of the channel
///     for (const platform::Dictionary& item : parser->episodes()) ...
///
/// Whoever wants to know what it takes, and from where, derives from it.
class FeedParser : private platform::XMLParserEvents {
 public:
  /// A parser of the bytes, which it gives up as it reads them; null for absent data.
  static std::unique_ptr<FeedParser> parserWithFeedData(std::optional<platform::ByteSource> data);

  /// Hands each item's dictionary over, in document order, once nothing is added to it any more,
  /// instead of keeping it. For feeds of tens of thousands of items, whose records are made at
  /// once.
  using ItemReceiver = std::function<void(const platform::Dictionary&)>;
  void setItemReceiver(ItemReceiver receiver) { itemReceiver_ = std::move(receiver); }

  /// The prefixes of podcast-directory elements; "orvane" alone at first.
  const std::vector<std::string>& directoryPrefixes() const { return directoryPrefixes_; }
  void setDirectoryPrefixes(std::vector<std::string> prefixes) {
    directoryPrefixes_ = std::move(prefixes);
  }

  /// Runs the whole parse. False for malformed XML, with the XML parser's own record, and for a
  /// document without an "rss" element, with code 3.
  bool parseWithError(platform::ErrorSlot& error);

  /// "rss" once an element of that local name has been seen; nothing else is ever recognised.
  const std::optional<std::string>& feedType() const { return feedType_; }
  void setFeedType(std::optional<std::string> type) { feedType_ = std::move(type); }

  const platform::Dictionary& feedAttributes() const { return feedAttributes_; }
  /// In document order; none when a receiver got them.
  const std::vector<platform::Dictionary>& episodes() const { return episodes_; }

 protected:
  explicit FeedParser(platform::ByteSource data) : feedParser_(std::move(data), *this) {}

  // A derived class that overrides these calls them, too.
  void didStartElement(const platform::XMLName& name,
                       const platform::XMLAttributes& attributes) override;
  void didEndElement(const platform::XMLName& name) override;
  void foundCharacters(std::string_view text) override { cdataBuffer_.append(text); }
  /// Gives a key of the open item, or of the channel between items, its value.
  virtual void take(platform::Dictionary& target, const platform::Text& key,
                    platform::PropertyListValue value);

  bool isInItem() const { return currentEpisode_ != nullptr; }
  bool isOfDirectory(const platform::XMLName& name) const;
  /// Where the event stands that is being delivered.
  platform::TextPosition position() const { return feedParser_.position(); }
  /// What was wrong with the XML.
  const std::optional<platform::XMLFault>& fault() const { return fault_; }

 private:
  /// The first place of a marker in a text that only grows at its end; nothing is searched twice,
  /// so that asking again and again costs no more than asking once.
  class MarkerSearch {
   public:
    explicit MarkerSearch(std::string_view marker) : marker_(marker) {}
    /// What follows the first marker; absent while there is none.
    std::optional<std::string_view> textBehindMarker(std::string_view text);
    void restart() { *this = MarkerSearch(marker_); }

   private:
    std::string_view marker_;
    std::size_t start_ = 0;  // of the marker, or of where it may still begin
  };

  void endItem();
  void readEnclosure(const platform::XMLAttributes& attributes);
  void readAdvisoryLabel();
  void readDate();
  void readLink();

  bool readsRSS() const { return feedType_ == "rss"; }
  /// The open item, or the channel between items.
  platform::Dictionary& target() { return currentEpisode_ ? *currentEpisode_ : feedAttributes_; }
  void takeText(const platform::Text& key);
  /// Takes the value unless the key has one already.
  void takeFirst(const platform::Text& key, std::string_view value);
  /// Counts a value that is kept, and the characters of a text.
  void countField(std::string_view text = {});
  void emptyBuffer();

  platform::Dictionary* currentEpisode_ = nullptr;  // the last of episodes_, or null between items
  std::vector<platform::Dictionary> episodes_;
  ItemReceiver itemReceiver_;
  std::vector<std::string> directoryPrefixes_{QELDirectory().prefix};
  bool parsingImage_ = false;
  platform::Dictionary feedAttributes_;
  std::string cdataBuffer_;
  MarkerSearch collectionMarker_{"collection/uuid/"};
  MarkerSearch documentMarker_{"document/uuid/"};
  platform::XMLParser feedParser_;
  std::optional<platform::XMLFault> fault_;
  std::optional<std::string> feedType_;
};
