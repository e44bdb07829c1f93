#pragma once

#include <optional>
#include <string_view>

#include "platform/text/Text.h"

/// The reference types: how a location is fetched, as a file that is copied or a URL that is
/// downloaded. Texts read from a reference file may hold any other value.
inline constexpr std::string_view kReferenceTypeLocal = "local";
inline constexpr std::string_view kReferenceTypeRemote = "remote";

/// The reference type of a location: "remote" when it begins with "http" or "file:" in any mix of
/// case, "local" for anything else, absent for an absent or empty location.
///
/// File URLs count as remote because they are fetched as URLs, not copied as paths.
platform::OptionalText QELReferenceType(std::optional<std::string_view> location);

/// Where a media type would be derived from a location. Always absent: a type guessed from an
/// extension would change every reference file and feed that is written.
platform::OptionalText QELMIMEType(std::optional<std::string_view> location);
