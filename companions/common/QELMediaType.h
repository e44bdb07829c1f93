#pragma once

#include <optional>
#include <string_view>

/// The MIME type of the audio, video or image files with this extension ("mp3", in any case);
/// absent for an extension that is not known.
std::optional<std::string_view> QELMediaTypeOfExtension(std::string_view extension);

/// Whether the text looks like a media type: two words with a slash between them.
bool QELIsMediaType(std::string_view text);
