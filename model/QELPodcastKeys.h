#pragma once

#include <optional>
#include <span>
#include <string_view>

#include "model/QELPodcastSource.h"
#include "platform/plist/PropertyListValue.h"
#include "platform/text/Text.h"

/// One text field of the podcast, its key in a reference dictionary and its key among the feed
/// attributes of the feed parser, empty where a feed has none.
struct QELPodcastKey {
  std::string_view key;
  std::string_view feedKey;
  const platform::OptionalText& (QELPodcastSource::*value)() const;
  void (QELPodcastSource::*setValue)(platform::OptionalText);
};

/// The twelve "Podcast" keys of a reference dictionary, in the order in which they are read and
/// written: the eight that describe the podcast, then its location, then its poster.
std::span<const QELPodcastKey> QELPodcastKeys();

/// The first eight of them: what describes the podcast wherever it is kept.
std::span<const QELPodcastKey> QELPodcastDescriptiveKeys();

/// Puts the source's fields into the dictionary under their keys, each only if it is present.
void QELAddPodcastKeys(std::span<const QELPodcastKey> keys, const QELPodcastSource& source,
                       platform::Dictionary& dictionary);
