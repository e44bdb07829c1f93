#include "generators/QELFeedPodcastGenerator.h"

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
/// and a URL stay as they are. Absent for an absent location and for an unknown reference type.
std::optional<Text> resolvedURL(const std::optional<Text>& location,
                                const std::optional<Text>& referenceType) {
  if (!location || !referenceType || *referenceType == kReferenceTypeRemote) return location;
  if (*referenceType != kReferenceTypeLocal) return std::nullopt;
  if (!platform::isAbsolutePath(*location)) return location;
  return Text(platform::fileURLText(*location));
}

void appendTextChild(XMLElement element, std::string_view name, const std::optional<Text>& text) {
  if (text) element.appendChild(name, *text);
}

void appendEnclosure(XMLElement item, const QELEpisode& episode) {
  const std::optional<Text> url = resolvedURL(episode.location(), episode.referenceType());
  if (!url) return;
  const XMLElement enclosure = item.appendChild("enclosure");
  enclosure.appendAttribute("url", *url);
  if (const auto type = episode.contentType()) enclosure.appendAttribute("type", *type);
  if (const std::uint64_t length = episode.contentLength(); length != 0) {
    enclosure.appendAttribute("length", platform::formattedText("%lu", {length}));
  }
}

/// Both kinds of item go through the same rows, so that their common children stand in one order.
template <typename Item>
void populate(XMLElement element, const Item& item, bool stampNow, const QELFeedStyle& style) {
  appendTextChild(element, "title", item.title());
  appendTextChild(element, "dc:creator", item.author());
  appendTextChild(element, style.author, item.author());
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
  appendTextChild(element, "description", descriptionOf(item));
  appendTextChild(element, style.summary, descriptionOf(item));
  if (const auto value = explicitValue(item.advisoryLabel())) {
    element.appendChild(style.explicitness, *value);
  }
  appendTextChild(element, "qel:uuid", item.uuid());
  if constexpr (!isPodcast<Item>) {
    if (const std::int64_t order = item.orvaneOrder(); order >= 0) {
      element.appendChild("qel:order", platform::formattedText("%ld", {order}));
    }
  }

  if (const auto posterURL = resolvedURL(item.posterLocation(), item.posterReferenceType())) {
    if constexpr (isPodcast<Item>) {
      const XMLElement image = element.appendChild("image");
      image.appendChild("url", *posterURL);
      appendTextChild(image, "title", item.title());
    }
    element.appendChild(style.image).appendAttribute("href", *posterURL);
  }
  if constexpr (isPodcast<Item>) {
    appendTextChild(element, "link", item.location());
  } else {
    appendEnclosure(element, item);
  }
}

/// What the feed will hardly exceed, in bytes: one that moves while it grows stands in memory twice
/// for a moment. What is not used of it costs nothing.
std::size_t likelySize(const QELPodcastSource& source) {
  std::size_t size = 1024;
  // Each of these texts also brings its share of the markup, and of the texts that are short.
  const auto add = [&size](const std::optional<Text>& text, std::size_t times) {
    constexpr std::size_t kShare = 256;
    if (text) size += kShare + times * text->size();
  };
  // A description stands there twice, and longer by what is escaped; of a path each byte may become
  // three.
  add(source.podcastDescription(), 3);
  add(source.posterLocation(), 6);
  if (!source.episodes()) return size;
  for (const auto& episode : *source.episodes()) {
    constexpr std::size_t kSizeOfEmptyItem = 16;
    size += kSizeOfEmptyItem;
    add(episode->title(), 1);
    add(episode->episodeDescription(), 3);
    add(episode->location(), 3);
    add(episode->posterLocation(), 3);
  }
  return size;
}

}  // namespace

bool QELFeedPodcastGenerator::generateFromSource(QELPodcastSource& source,
                                                 platform::ErrorSlot& error) {
  std::string bytes;
  platform::XMLWriter document(bytes,
                               {.indentation = ' ', .indentationWidth = 2, .emptyTagEnd = " />"});
  if (format_ == "rss") {
    bytes.reserve(likelySize(source));
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
