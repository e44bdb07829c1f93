#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace platform {

/// Operations on the texts of paths that are to mean the same on other systems; none looks at the
/// file system.

/// The path below a directory to which a path relative to it leads, without "." and empty
/// components ("a//./b/../c" is "a/c"); absent when ".." leads out of the directory. A leading "/"
/// does not count.
std::optional<std::string> pathInside(std::string_view path);

/// Whether file systems of all kinds have files of that name: none of the characters that some
/// reserve, no dot or blank at the end of a component, no name that stands for a device.
bool isPortablePath(std::string_view path);

}  // namespace platform
