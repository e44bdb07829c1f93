#include "model/QELEpisodeMatching.h"

#include <array>
#include <map>
#include <string>
#include <utility>

#include "platform/text/ASCII.h"
#include "platform/text/Case.h"
#include "platform/xml/XMLEscaping.h"

namespace {

using Identity = QELEpisodeIdentity;
using Sign = std::optional<std::string>;

std::optional<std::chrono::seconds> wholeSeconds(std::optional<platform::PointInTime> date) {
  if (!date) return std::nullopt;
  return std::chrono::floor<std::chrono::seconds>(date->time_since_epoch());
}

platform::OptionalText unlessBlank(platform::OptionalText uuid) {
  return uuid && QELIsIdentifier(*uuid) ? std::move(uuid) : std::nullopt;
}

/// Unlike for different values, an absent one included, also when others are appended; alike for
/// those that a reference file cannot tell apart.
std::string written(const platform::OptionalText& text) {
  if (!text) return "-";
  const std::string kept = platform::textReadBack(*text);
  return std::to_string(kept.size()).append(":").append(kept);
}
std::string written(const std::optional<std::chrono::seconds>& date) {
  return date ? std::to_string(date->count()).append(";") : "-";
}

Sign uuidSign(const Identity& episode) {
  return episode.uuid ? Sign(QELComparableUUID(*episode.uuid)) : std::nullopt;
}
Sign uuidOriginSign(const Identity& episode) {
  if (!episode.uuid || !episode.origin) return std::nullopt;
  return written(episode.origin) + *uuidSign(episode);
}
Sign originTitleDateSign(const Identity& episode) {
  if (!episode.origin) return std::nullopt;
  return written(episode.origin) + written(episode.title) + written(episode.date);
}
Sign originTitleSign(const Identity& episode) {
  if (!episode.origin) return std::nullopt;
  return written(episode.origin) + written(episode.title);
}
Sign originDateSign(const Identity& episode) {
  if (!episode.origin) return std::nullopt;
  return written(episode.origin) + written(episode.date);
}
Sign titleDateSign(const Identity& episode) {
  if (!episode.title || !episode.date) return std::nullopt;
  return written(episode.title) + written(episode.date);
}

/// The surest first.
constexpr std::array kSigns = {&uuidOriginSign,  &uuidSign,       &originTitleDateSign,
                               &originTitleSign, &originDateSign, &titleDateSign};

/// The kept episodes with one sign that are still to be had, those without and those with a uuid:
/// whoever may not take the one kind need not look through it for the other.
struct Candidates {
  struct Queue {
    std::vector<std::size_t> numbers;
    std::size_t next = 0;
  };
  std::array<Queue, 2> queues;

  std::optional<std::size_t> take(bool mayHaveUUID) {
    for (std::size_t kind = 0; kind <= (mayHaveUUID ? 1U : 0U); ++kind) {
      Queue& queue = queues.at(kind);
      if (queue.next < queue.numbers.size()) return queue.numbers[queue.next++];
    }
    return std::nullopt;
  }
};

}  // namespace

bool QELIsIdentifier(std::string_view text) {
  return !platform::trimmed(text).empty();
}

std::string QELComparableUUID(std::string_view uuid) {
  return platform::lowercased(platform::textReadBack(uuid));
}

QELEpisodeIdentity QELIdentityOf(const QELEpisode& episode) {
  return {unlessBlank(episode.uuid()), episode.location(), episode.title(),
          wholeSeconds(episode.date())};
}

QELEpisodeIdentity QELIdentityOf(const platform::Dictionary& entry) {
  const platform::PropertyListValue* date = platform::valueForKey(entry, "EpisodeDate");
  return {unlessBlank(platform::textForKey(entry, "EpisodeUUID")),
          platform::textForKey(entry, "EpisodeOrigin"), platform::textForKey(entry, "EpisodeName"),
          wholeSeconds(date ? date->asDate() : std::nullopt)};
}

std::vector<QELEpisodeIdentity> QELIdentitiesOf(const QELEpisodeList& episodes) {
  std::vector<QELEpisodeIdentity> identities;
  identities.reserve(episodes.size());
  for (const auto& episode : episodes) identities.push_back(QELIdentityOf(*episode));
  return identities;
}

std::vector<std::optional<std::size_t>> QELMatchedEpisodes(std::span<const Identity> source,
                                                           std::span<const Identity> kept) {
  std::vector<std::optional<std::size_t>> matches(source.size());
  std::vector<bool> isTaken(kept.size());
  for (const auto& sign : kSigns) {
    const bool isOfUUID = sign == &uuidOriginSign || sign == &uuidSign;
    std::map<std::string, Candidates> candidates;
    for (std::size_t number = 0; number < kept.size(); ++number) {
      const Sign has = isTaken[number] ? std::nullopt : sign(kept[number]);
      if (!has) continue;
      candidates[*has].queues.at(kept[number].uuid ? 1 : 0).numbers.push_back(number);
    }
    for (std::size_t index = 0; index < source.size(); ++index) {
      const Sign has = matches[index] ? std::nullopt : sign(source[index]);
      const auto found = has ? candidates.find(*has) : candidates.end();
      if (found == candidates.end()) continue;
      matches[index] = found->second.take(isOfUUID || !source[index].uuid);
      if (matches[index]) isTaken[*matches[index]] = true;
    }
  }
  return matches;
}
