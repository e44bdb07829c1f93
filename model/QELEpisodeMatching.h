#pragma once

#include <chrono>
#include <cstddef>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "model/QELEpisode.h"
#include "platform/plist/PropertyListValue.h"
#include "platform/text/Text.h"

/// Whether an episode can be told from others by the text, a uuid or what stands in for one: not by
/// a blank one, which others have, too.
bool QELIsIdentifier(std::string_view text);

/// The same for texts that are one uuid: in any mix of case, and without what no reference file
/// holds.
std::string QELComparableUUID(std::string_view uuid);

/// What an episode is known by.
struct QELEpisodeIdentity {
  platform::OptionalText uuid;
  platform::OptionalText origin;  // where its media comes from
  platform::OptionalText title;
  std::optional<std::chrono::seconds> date;  // since 1970, as property lists hold dates
};

/// That of an episode of the source, which comes from its location, and that of an entry of a
/// bundle's reference file, which has its origin under a key of its own.
QELEpisodeIdentity QELIdentityOf(const QELEpisode& episode);
QELEpisodeIdentity QELIdentityOf(const platform::Dictionary& entry);
std::vector<QELEpisodeIdentity> QELIdentitiesOf(const QELEpisodeList& episodes);

/// For each episode of the source the number of the kept one that it is; absent for a new one.
///
/// Where both have a uuid, and not a blank one, it decides, in any mix of case. Otherwise they are
/// the same if they come from one place, unless title and date both differ ("latest.mp3" is another
/// one each week); else if title and date are the same, where both have both. Each kept episode is
/// one of the source's at most: the surer sign takes it, and of equal ones the first. The cost
/// grows with the number of episodes as sorting them does, however many have a sign in common.
std::vector<std::optional<std::size_t>> QELMatchedEpisodes(
    std::span<const QELEpisodeIdentity> source, std::span<const QELEpisodeIdentity> kept);
