#include "model/QELReferenceKeys.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <numeric>
#include <string>
#include <utility>
#include <vector>

#include "platform/text/Case.h"

namespace {

constexpr auto kKeys = std::to_array<QELReferenceKey>({
    {"PodcastUUID", "a text"},
    {"PodcastName", "a text"},
    {"PodcastAuthor", "a text"},
    {"PodcastCopyright", "a text"},
    {"PodcastKeywords", "a text"},
    {"PodcastCategory", "a text"},
    {"PodcastDescription", "a text"},
    {"PodcastAdvisoryLabel", "a text"},
    {"PodcastReference", "a text"},
    {"PodcastReferenceType", "a text"},
    {"PodcastPosterReference", "a text"},
    {"PodcastPosterReferenceType", "a text"},
    {"PodcastOrigin", "a text"},
    {"PodcastPosterOrigin", "a text"},
    {"Episodes", "an array"},
    {"AllowedPosterTypes", "an array"},
    {"AllowedEpisodeTypes", "an array"},
    {"EpisodeUUID", "a text"},
    {"EpisodeName", "a text"},
    {"EpisodeAuthor", "a text"},
    {"EpisodeDate", "a date"},
    {"EpisodeKeywords", "a text"},
    {"EpisodeDescription", "a text"},
    {"EpisodeCategory", "a text"},
    {"EpisodeAdvisoryLabel", "a text"},
    {"EpisodeOrder", "an integer"},
    {"EpisodeType", "a text"},
    {"EpisodeFileSize", "an integer"},
    {"EpisodeReference", "a text"},
    {"EpisodeReferenceType", "a text"},
    {"EpisodePosterReference", "a text"},
    {"EpisodePosterReferenceType", "a text"},
    {"EpisodeOrigin", "a text"},
    {"EpisodePosterOrigin", "a text"},
});

/// How many letters have to be put in, left out or changed to make one text the other.
std::size_t distance(std::string_view left, std::string_view right) {
  std::vector<std::size_t> row(right.size() + 1);
  std::iota(row.begin(), row.end(), 0);
  for (std::size_t i = 0; i < left.size(); ++i) {
    std::size_t diagonal = std::exchange(row[0], i + 1);
    for (std::size_t j = 0; j < right.size(); ++j) {
      const std::size_t changed = diagonal + (left[i] == right[j] ? 0 : 1);
      diagonal = row[j + 1];
      row[j + 1] = std::min({changed, row[j] + 1, row[j + 1] + 1});
    }
  }
  return row.back();
}

}  // namespace

const QELReferenceKey* QELReferenceKeyNamed(std::string_view name) {
  const auto* const key = std::find_if(kKeys.begin(), kKeys.end(),
                                       [&](const QELReferenceKey& k) { return k.name == name; });
  return key == kKeys.end() ? nullptr : key;
}

const QELReferenceKey* QELLikeliestReferenceKey(std::string_view name, bool isOfEpisode) {
  constexpr std::size_t kLongest = 40;
  if (name.size() > kLongest) return nullptr;
  // A podcast has not everything that an episode has: "PodcastDate" is not spelt wrongly.
  if (!isOfEpisode && name.starts_with("Podcast") &&
      QELReferenceKeyNamed("Episode" + std::string(name.substr(7))) != nullptr) {
    return nullptr;
  }
  const QELReferenceKey* likeliest = nullptr;
  std::size_t least = 3;  // a word that differs more is another one
  for (const QELReferenceKey& key : kKeys) {
    if (key.isOfEpisode() != isOfEpisode) continue;
    const std::size_t differing =
        distance(platform::lowercased(name), platform::lowercased(key.name));
    if (differing >= least) continue;
    least = differing;
    likeliest = &key;
  }
  return likeliest;
}
