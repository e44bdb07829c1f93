#include "companions/publish/QELPublishedFeedGenerator.h"

#include "model/QELEpisodeMatching.h"
#include "platform/time/DateFormatter.h"
#include "platform/time/TimeZone.h"

namespace {

using platform::PointInTime;
using platform::Text;
using platform::XMLElement;

constexpr std::string_view kAtomNamespace = "http://www.w3.org/2005/Atom";

std::string englishDateText(PointInTime date) {
  static const platform::DateFormatter formatter("EEE, dd MMM yyyy HH:mm:ss 'GMT'", "C",
                                                 platform::TimeZone::withOffset(0));
  return formatter.format(date);
}

}  // namespace

QELPublishedFeedGenerator::QELPublishedFeedGenerator(QELDirectory directory,
                                                     std::optional<PointInTime> stamp) {
  QELFeedStyle style(std::move(directory));
  style.dateText = &englishDateText;
  if (stamp) style.now = [date = *stamp] { return date; };
  setStyle(std::move(style));
}

std::optional<Text> QELPublishedFeedGenerator::guidOf(const QELEpisode& episode) {
  for (auto text : {episode.uuid(), episode.location()}) {
    if (text && QELIsIdentifier(*text)) return text;
  }
  return std::nullopt;
}

void QELPublishedFeedGenerator::appendNamespaces(XMLElement rss) const {
  if (selfURL_) rss.appendAttribute("xmlns:atom", kAtomNamespace);
}

void QELPublishedFeedGenerator::appendToChannel(XMLElement channel,
                                                const QELPodcastSource& /*source*/) const {
  if (language_) channel.appendChild("language", *language_);
  if (!selfURL_) return;
  const XMLElement link = channel.appendChild("atom:link");
  link.appendAttribute("href", *selfURL_);
  link.appendAttribute("rel", "self");
  link.appendAttribute("type", "application/rss+xml");
}

void QELPublishedFeedGenerator::appendToItem(XMLElement item, const QELEpisode& episode) const {
  const std::optional<Text> guid = guidOf(episode);
  if (!guid) return;
  // Even where it is a URL, it is not one of a page.
  const XMLElement element = item.appendChild("guid");
  element.appendAttribute("isPermaLink", "false");
  element.endWithText(*guid);
}
