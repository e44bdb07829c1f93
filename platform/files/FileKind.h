#pragma once

#include <optional>
#include <string_view>

namespace platform {

/// What a media or poster file is by its first bytes: "an MP3 file", "a page of HTML"; absent for
/// what is not known here.
std::optional<std::string_view> kindOfBytes(std::string_view head);

/// Whether files of that kind may have the extension (in any case); true as well for an extension
/// that is not known here, unless the file is a page of HTML.
bool isExtensionOfKind(std::string_view extension, std::string_view kind);

inline constexpr std::string_view kHTMLPage = "a page of HTML";

}  // namespace platform
