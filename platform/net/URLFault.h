#pragma once

#include <string>
#include <string_view>

namespace platform {

/// Whether the text begins with the scheme of a URL that can be fetched: http:, https: or file:, in
/// any mix of case.
bool hasFetchedScheme(std::string_view text);

/// Whether people would take the text for a URL: it has such a scheme, or "://" behind another one.
bool looksLikeURL(std::string_view text);

/// What keeps a text from being a URL that can be fetched, as people can mend it: `" " is written
/// %20`, `it has no host`; empty for one that is. URL::parse decides; here it is only explained.
std::string urlFault(std::string_view text);

}  // namespace platform
