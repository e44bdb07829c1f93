#include "companions/common/QELPrivateURL.h"

#include <algorithm>
#include <cstddef>

bool QELNamesUser(std::string_view url) {
  const std::size_t scheme = url.find("://");
  if (scheme == std::string_view::npos) return false;
  const std::string_view rest = url.substr(scheme + 3);
  return rest.substr(0, rest.find_first_of("/?#")).find('@') != std::string_view::npos;
}

bool QELRemembersUser(const platform::Dictionary& kept) {
  const auto isPrivate = [](const platform::Dictionary& dictionary, std::string_view key) {
    const auto origin = platform::textForKey(dictionary, key);
    return origin && QELNamesUser(*origin);
  };
  if (isPrivate(kept, "PodcastOrigin") || isPrivate(kept, "PodcastPosterOrigin")) return true;
  const platform::PropertyListValue* const value = platform::valueForKey(kept, "Episodes");
  const auto* const episodes = value == nullptr ? nullptr : value->asArray();
  if (episodes == nullptr) return false;
  return std::any_of(episodes->begin(), episodes->end(), [&](const auto& entry) {
    const platform::Dictionary* const episode = entry.asDictionary();
    return episode != nullptr &&
           (isPrivate(*episode, "EpisodeOrigin") || isPrivate(*episode, "EpisodePosterOrigin"));
  });
}
