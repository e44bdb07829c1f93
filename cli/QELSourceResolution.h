#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "cli/common/QELDirectory.h"
#include "model/QELPodcastSource.h"
#include "platform/plist/PropertyListValue.h"

/// The URL, valid or not, that a source string is to be: one that begins with "http", "pcast" or
/// "file:", with "pcast" read as "http". Absent for a path. Case counts here, unlike in the
/// reference type of a location: "HTTP://..." is a path.
std::optional<std::string> QELURLTextOf(std::string_view source);

/// Whether the source string is acceptable at all. A URL must be valid; a path, even an empty one,
/// is acceptable, whether it names a file or not. Without a source string, standard input must be
/// asked for and hold a property list.
bool QELValidateSource(std::optional<std::string_view> source, bool readStandardInput);

/// The property list on standard input, read and parsed once for the whole process; null when it is
/// none.
std::shared_ptr<const platform::PropertyListValue> QELPodcastFromStandardInput();

/// The source that the string names: a feed for a URL (see QELValidateSource), a bundle or a
/// reference file for an existing path with the extension "podcast" or "plist" in any mix of case.
/// Null when there is no such thing. Nothing is fetched yet. The prefixes are those under which the
/// podcast-directory elements of a feed are read; for the stall limit see QELFeedPodcastSource.
std::unique_ptr<QELPodcastSource> initWithSourceString(
    std::string_view source, std::vector<std::string> directoryPrefixes = {QELDirectory().prefix},
    int stallLimit = 0);

/// The source for the reference file on standard input; null when there is none.
std::unique_ptr<QELPodcastSource> initWithStandardInput();
