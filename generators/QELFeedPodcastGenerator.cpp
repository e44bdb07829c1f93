#include "generators/QELFeedPodcastGenerator.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <string_view>
#include <type_traits>
#include <utility>

#include "cli/common/QELError.h"
#include "cli/common/QELReferenceType.h"
#include "platform/files/Paths.h"
#include "platform/net/URL.h"
#include "platform/text/Case.h"
#include "platform/text/FormattedText.h"
#include "platform/xml/XMLEscaping.h"

namespace {

using platform::Text;
using platform::XMLElement;

constexpr std::string_view kDublinCoreNamespace = "http://purl.org/dc/elements/1.1/";
constexpr std::string_view kQELNamespace = "https://qel.example/ns/1.0";

template <typename Item>
constexpr bool isPodcast = std::is_base_of_v<QELPodcastSource, Item>;

std::optional<Text> descriptionOf(const QELPodcastSource& podcast) {
  return podcast.podcastDescription();
}
std::optional<Text> descriptionOf(const QELEpisode& episode) {
  return episode.episodeDescription();
}

/// The value of "orvane:explicit" for an advisory label; absent for a label without one.
std::optional<std::string_view> explicitValue(const std::optional<Text>& label) {
  if (!label) return std::nullopt;
  const std::string lowercased = platform::lowercased(*label);
  if (lowercased == "explicit" || lowercased == "yes") return "yes";
  if (lowercased == "clean") return "clean";
  return std::nullopt;
}

/// The location as a feed can carry it: an absolute local path becomes a file URL, a relative path
/// and a URL stay as they are. Absent for an unknown reference type.
std::optional<Text> resolvedURL(const Text& location, const std::optional<Text>& referenceType) {
  if (!referenceType || *referenceType == kReferenceTypeRemote) return location;
  if (*referenceType != kReferenceTypeLocal) return std::nullopt;
  if (!platform::isAbsolutePath(location)) return location;
  return Text(platform::fileURLText(location));
}

void appendTextChild(XMLElement element, std::string_view name, const std::optional<Text>& text) {
  if (text) element.appendChild(name, *text);
}

void appendEnclosure(XMLElement item, const QELEpisode& episode) {
  const std::optional<Text> location = episode.location();
  if (!location) return;
  const std::optional<Text> url = resolvedURL(*location, episode.referenceType());
  if (!url) return;
  const XMLElement enclosure = item.appendChild("enclosure");
  enclosure.appendAttribute("url", *url);
  if (const auto type = episode.contentType()) enclosure.appendAttribute("type", *type);
  if (const std::uint64_t length = episode.contentLength(); length != 0) {
    enclosure.appendAttribute("length", std::to_string(length));
  }
}

template <typename Item>
void appendPoster(XMLElement element, const Item& item, const QELFeedStyle& style) {
  const auto& location = item.posterLocation();
  if (!location) return;
  const std::optional<Text> url = resolvedURL(*location, item.posterReferenceType());
  if (!url) return;
  if constexpr (isPodcast<Item>) {
    const XMLElement image = element.appendChild("image");
    image.appendChild("url", *url);
    appendTextChild(image, "title", item.title());
  }
  element.appendChild(style.image).appendAttribute("href", *url);
}

/// Both kinds of item go through the same rows, so that their common children stand in one order.
template <typename Item>
void populate(XMLElement element, const Item& item, bool stampNow, const QELFeedStyle& style) {
  appendTextChild(element, "title", item.title());
  const auto& author = item.author();
  appendTextChild(element, "dc:creator", author);
  appendTextChild(element, style.author, author);
  if (stampNow) {
    element.appendChild("pubDate", style.dateText(style.now()));
  } else if constexpr (!isPodcast<Item>) {
    if (const auto date = item.date()) element.appendChild("pubDate", style.dateText(*date));
  }
  if constexpr (isPodcast<Item>) appendTextChild(element, "copyright", item.copyright());
  appendTextChild(element, style.keywords, item.keywords());
  if (const auto& category = item.category()) {
    element.appendChild(style.category).appendAttribute("text", *category);
  }
  const std::optional<Text> description = descriptionOf(item);
  appendTextChild(element, "description", description);
  appendTextChild(element, style.summary, description);
  if (const auto value = explicitValue(item.advisoryLabel())) {
    element.appendChild(style.explicitness, *value);
  }
  appendTextChild(element, "qel:uuid", item.uuid());
  if constexpr (!isPodcast<Item>) {
    if (const std::int64_t order = item.orvaneOrder(); order >= 0) {
      element.appendChild("qel:order", std::to_string(order));
    }
  }

  appendPoster(element, item, style);
  if constexpr (isPodcast<Item>) {
    appendTextChild(element, "link", item.location());
  } else {
    appendEnclosure(element, item);
  }
}

// Sizes of feeds are counted in 64 bits: texts that many episodes share may come to more than the
// addresses of the processor.

/// What `populate` writes of the item at most, in bytes.
template <typename Item>
std::uint64_t sizeOfItem(const Item& item) {
  constexpr std::uint64_t kSizeOfMarkup = 128;  // of a field, whose text may stand there twice
  constexpr std::uint64_t kTimesInPodcast = isPodcast<Item> ? 2 : 1;
  std::uint64_t size = kSizeOfMarkup;  // that of the item, with its label and its order
  const auto add = [&](const std::optional<Text>& text, std::uint64_t times) {
    if (text) size += kSizeOfMarkup + times * (text->size() + platform::sizeOfReferences(*text));
  };
  const auto addLocation = [&](const std::optional<Text>& text, std::uint64_t times) {
    add(text, times);
    // Each byte of a path may become three.
    if (text) size += 2 * times * text->size();
  };
  add(item.title(), kTimesInPodcast);
  add(item.author(), 2);
  add(item.keywords(), 1);
  add(item.category(), 1);
  add(descriptionOf(item), 2);
  add(item.uuid(), 1);
  addLocation(item.posterLocation(), kTimesInPodcast);
  addLocation(item.location(), 1);
  if constexpr (isPodcast<Item>) {
    add(item.copyright(), 1);
  } else {
    add(item.contentType(), 1);
    if (item.date()) size += kSizeOfMarkup;
  }
  return size;
}

/// What the feed takes at most, in bytes: one that moves while it grows stands in memory twice for
/// a moment.
std::uint64_t sizeOfFeed(const QELPodcastSource& source) {
  constexpr std::uint64_t kSizeOfEmptyFeed = 1024;
  std::uint64_t size = kSizeOfEmptyFeed + sizeOfItem(source);
  if (!source.episodes()) return size;
  for (const auto& episode : *source.episodes()) size += sizeOfItem(*episode);
  return size;
}

}  // namespace

bool QELFeedPodcastGenerator::generateFromSource(QELPodcastSource& source,
                                                 platform::ErrorSlot& error) {
  std::string bytes;
  platform::XMLWriter document(bytes,
                               {.indentation = ' ', .indentationWidth = 2, .emptyTagEnd = " />"});
  if (format_ == "rss") {
    bytes.reserve(
        static_cast<std::size_t>(std::min<std::uint64_t>(sizeOfFeed(source), bytes.max_size())));
    addRSS(document, source);
  } else if (format_ != "atom") {
    error =
        QELError(2, platform::formattedText("\"%@\" is not a recognized feed format", {format_}));
    return false;
  }
  document.finish();
  setXmlData(std::make_shared<const std::string>(std::move(bytes)));
  return true;
}

void QELFeedPodcastGenerator::addRSS(platform::XMLWriter& document,
                                     const QELPodcastSource& source) const {
  const XMLElement rss = document.appendRoot("rss");
  rss.appendAttribute("version", "2.0");
  rss.appendAttribute("xmlns:dc", kDublinCoreNamespace);
  rss.appendAttribute("xmlns:" + style_.directory.prefix, style_.directory.uri);
  rss.appendAttribute("xmlns:qel", kQELNamespace);
  appendNamespaces(rss);

  const XMLElement channel = rss.appendChild("channel");
  QELPopulateRSSElementFromItem(channel, source, generatePubDate_, style_);
  appendToChannel(channel, source);
  if (!source.episodes()) return;
  for (const auto& episode : *source.episodes()) {
    const XMLElement item = channel.appendChild("item");
    QELPopulateRSSElementFromItem(item, *episode, false, style_);
    appendToItem(item, *episode);
  }
}

void QELPopulateRSSElementFromItem(XMLElement element, const QELPodcastSource& item, bool stampNow,
                                   const QELFeedStyle& style) {
  populate(element, item, stampNow, style);
}

void QELPopulateRSSElementFromItem(XMLElement element, const QELEpisode& item, bool stampNow,
                                   const QELFeedStyle& style) {
  populate(element, item, stampNow, style);
}

void QELPopulateAtomElementFromItem(XMLElement /*element*/, const QELPodcastSource& /*item*/) {}
void QELPopulateAtomElementFromItem(XMLElement /*element*/, const QELEpisode& /*item*/) {}
