#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "companions/publish/QELRemarks.h"
#include "model/QELPodcastSource.h"

/// Makes a loaded show fit to be published: every location in it becomes one that others can fetch,
/// and what can be learned from the files of the show is filled in.
///
///     QELPublication publication("/shows/lantern.podcast", "https://media.example/lantern/");
///     publication.prepare(*source);
///     for (const std::string& line : publication.remarks().lines()) warn(line);
class QELPublication {
 public:
  /// The root is the directory in which the show lies, absolute and without "." and "..": relative
  /// locations begin there, and what lies below it will be found below the base, a URL that ends in
  /// "/". Without a root, the show has no local file that could be published.
  /// The feed is the path at which it will be written.
  QELPublication(std::optional<std::string> root, std::optional<std::string> base,
                 std::string feed = {});

  /// The page of the show, instead of what its source says.
  void setLink(std::optional<std::string> link) { link_ = std::move(link); }

  /// Changes the show's record and those of its episodes in place:
  ///  - media and posters below the root get their URL below the base; a path of this machine that
  ///    has none is removed;
  ///  - a link of the show that is no URL of the network is removed;
  ///  - the length of media below the root is that of the file, and media without a type get that
  ///    of their extension.
  void prepare(QELPodcastSource& podcast);

  /// What readers and directories will miss, and what was removed.
  const QELRemarks& remarks() const { return remarks_; }
  /// Whether the feed would take the place of a file that the show lists.
  bool holdsFeed() const { return holdsFeed_; }
  /// Whether the show lists a file that cannot be read.
  bool isIncomplete() const { return isIncomplete_; }

 private:
  /// What a location comes to.
  struct Place {
    platform::OptionalText url;
    std::optional<std::uint64_t> size;  // of a file that is there
  };
  Place placeOf(const platform::Text& location, std::string_view part);
  void prepareEpisode(QELEpisode& episode, const std::string& name);

  std::optional<std::string> root_;  // ends in "/"
  std::optional<std::string> base_;
  std::optional<std::string> link_;
  std::string feed_;
  QELRemarks remarks_;
  bool holdsFeed_ = false;
  bool isIncomplete_ = false;
};
