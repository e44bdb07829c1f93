#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/text/ErrorRecord.h"

namespace platform {

/// Operations on the text of a path; none looks at the file system. Separators are "/".

/// The last component; trailing separators do not count as one. Empty for "" and "/".
std::string_view lastPathComponent(std::string_view path);

/// The text behind the last "." of the last component. Empty without a dot, for a dot that begins
/// the component (".profile") and for one that ends it ("name.").
std::string_view pathExtension(std::string_view path);

/// The path without its last component's extension, the dot before it and separators behind it; a
/// path without an extension stays, and so does one that only begins with a dot. "name." loses its
/// dot.
std::string_view pathWithoutExtension(std::string_view path);

/// The two joined by one separator, doubled separators collapsed ("a/" and "/b" give "a/b"). An
/// empty part leaves the other.
std::string joinedPath(std::string_view parent, std::string_view child);

bool isAbsolutePath(std::string_view path);

/// A leading "~" (or "~user") expanded to the home directory, empty and "." components removed,
/// ".." removing the component before it ("/.." is "/"), no trailing separator. Symbolic links are
/// not resolved. A relative path stays relative: it may keep ".." at its start, and is "." when
/// nothing else is left of it.
std::string standardisedPath(std::string_view path);

/// The process's working directory, absolute. Absent, and the slot filled, when it cannot be told,
/// as after its removal.
std::optional<std::string> currentDirectory(ErrorSlot& error);

/// The directory for temporary files: TMPDIR, or /tmp.
std::string temporaryDirectory();

}  // namespace platform
