#include "companions/publish/QELPublication.h"

#include <cstddef>
#include <filesystem>
#include <system_error>
#include <unordered_set>
#include <utility>

#include "cli/common/QELReferenceType.h"
#include "companions/common/QELMediaType.h"
#include "companions/common/QELPrivateURL.h"
#include "companions/common/QELSourceLoading.h"
#include "companions/publish/QELPublishedFeedGenerator.h"
#include "platform/files/Paths.h"
#include "platform/files/RegularFile.h"
#include "platform/net/URL.h"
#include "platform/text/Case.h"
#include "platform/text/FormattedText.h"

namespace {

using platform::OptionalText;
using platform::Text;

bool isAbsent(const OptionalText& text) {
  return !text || text->empty();
}

/// As a remark names it.
std::string nameOf(const QELEpisode& episode, std::size_t number) {
  const OptionalText title = episode.title();
  if (isAbsent(title)) return "episode " + std::to_string(number);
  return platform::formattedText("\"%@\"", {*title});
}

bool isOfNetwork(const std::optional<platform::URL>& url) {
  return url && (url->scheme() == "http" || url->scheme() == "https");
}

/// What of the path lies below the root, which ends in "/"; absent for a path that leads elsewhere.
std::optional<std::string> pathBelow(const std::string& root, const std::string& path) {
  const auto rest = [](const std::string& whole, const std::string& begin) {
    const bool isBelow = whole.starts_with(begin) && whole.size() > begin.size();
    return isBelow ? std::optional(whole.substr(begin.size())) : std::nullopt;
  };
  if (auto below = rest(path, root)) return below;
  // An absolute path may name the same place by other links.
  std::error_code failure;
  const std::string realRoot = std::filesystem::canonical(root, failure).string();
  if (failure) return std::nullopt;
  const std::string realPath = std::filesystem::canonical(path, failure).string();
  if (failure) return std::nullopt;
  return rest(realPath, realRoot.ends_with('/') ? realRoot : realRoot + "/");
}

/// Of what stands at the end of a path or of a URL's path.
OptionalText typeOf(const QELEpisode& episode) {
  const OptionalText location = episode.location();
  if (!location) return std::nullopt;
  const auto url = platform::URL::parse(*location);
  const std::string path = url ? url->path() : location->string();
  const auto type = QELMediaTypeOfExtension(platform::pathExtension(path));
  if (!type) return std::nullopt;
  return Text(*type);
}

}  // namespace

QELPublication::QELPublication(std::optional<std::string> root, std::optional<std::string> base,
                               std::string feed)
    : root_(std::move(root)), base_(std::move(base)), feed_(std::move(feed)) {
  if (root_ && !root_->ends_with('/')) *root_ += '/';
}

void QELPublication::prepare(QELPodcastSource& podcast) {
  if (isAbsent(podcast.title())) remarks_.add("the show has no title");
  if (isAbsent(podcast.podcastDescription())) remarks_.add("the show has no description");

  if (link_) {
    podcast.setLocation(*link_);
  } else if (!podcast.location() || !isOfNetwork(platform::URL::parse(*podcast.location()))) {
    podcast.setLocation(std::nullopt);
    remarks_.add("the show has no link: name its page with --link");
  }

  if (!isAbsent(podcast.posterLocation())) {
    podcast.setPosterLocation(placeOf(*podcast.posterLocation(), "the poster of the show").url);
    podcast.setPosterReferenceType(Text(kReferenceTypeRemote));
  } else {
    remarks_.add("the show has no poster");
  }

  if (!podcast.episodes()) return;
  std::unordered_set<std::string> guids;
  std::size_t number = 0;
  for (const auto& episode : *podcast.episodes()) {
    const std::string name = nameOf(*episode, ++number);
    prepareEpisode(*episode, name);
    const OptionalText guid = QELPublishedFeedGenerator::guidOf(*episode);
    if (!guid) {
      remarks_.add("no guid, for want of a uuid", name);
    } else if (!guids.insert(guid->string()).second) {
      remarks_.add("the guid is that of an episode before: readers show only one", name);
    }
  }
}

void QELPublication::prepareEpisode(QELEpisode& episode, const std::string& name) {
  if (isAbsent(episode.title())) remarks_.add("no title", name);
  if (!episode.date()) remarks_.add("no date", name);

  if (const OptionalText poster = episode.posterLocation(); !isAbsent(poster)) {
    episode.setPosterLocation(placeOf(*poster, "the poster of " + name).url);
    episode.setPosterReferenceType(Text(kReferenceTypeRemote));
  }

  const OptionalText location = episode.location();
  if (isAbsent(location)) {
    remarks_.add("no media", name);
    return;
  }
  if (isAbsent(episode.contentType())) episode.setContentType(typeOf(episode));
  const Place place = placeOf(*location, name);
  episode.setLocation(place.url);
  episode.setReferenceType(Text(kReferenceTypeRemote));
  if (!place.url) return;
  if (isAbsent(episode.contentType())) {
    remarks_.add("no type, and the extension tells none", name);
  }
  if (place.size) episode.setContentLength(*place.size);
  if (place.size == 0) {
    remarks_.add("the file is empty", name);
  } else if (episode.contentLength() == 0) {
    remarks_.add("no length", name);
  }
}

QELPublication::Place QELPublication::placeOf(const Text& location, std::string_view part) {
  const auto url = platform::URL::parse(location);
  const bool isFileURL = platform::lowercased(location).starts_with("file:");
  if (!isFileURL && location.view().find("://") != std::string_view::npos) {
    if (!url) remarks_.add("not a valid URL, so that readers may not find it", part);
    if (QELNamesUser(location)) {
      remarks_.add("its URL has a user or a password, which all can read in the feed", part);
    }
    return {location, std::nullopt};
  }

  const auto leftOut = [&](std::string_view why) {
    remarks_.add(std::string("left out, since ").append(why),
                 std::string(part).append(" (").append(location).append(")"));
    return Place();
  };
  if (!root_ || (isFileURL && !url)) return leftOut("a path is nothing that others can fetch");
  const std::string given = isFileURL ? url->path() : location.string();
  const std::string path =
      QELLastingName(platform::isAbsolutePath(given) ? given : platform::joinedPath(*root_, given));
  std::error_code ignored;
  holdsFeed_ |= std::filesystem::equivalent(path, feed_, ignored);
  const std::optional<std::string> below = pathBelow(*root_, path);
  if (!below) return leftOut("it does not lie in " + *root_);
  if (!base_) return leftOut("others cannot fetch it here: name where it will lie with --base");

  Place place{Text(*base_ + platform::percentEncodedPath(*below)), std::nullopt};
  platform::ErrorSlot error;
  if (const auto file = platform::RegularFile::open(path, error)) {
    place.size = file->size();
  } else {
    isIncomplete_ = true;
    remarks_.add("the file cannot be read: " + error->description,
                 std::string(part) + " (" + path + ")");
  }
  return place;
}
