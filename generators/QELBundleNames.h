#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/text/Text.h"

/// The rules by which the files of a bundle are named after the locations that they come from. They
/// go by texts alone; nothing here looks at the file system.

/// The last component of a location: of the decoded path for a URL, of the path itself otherwise.
/// Absent for a remote location that is no valid URL.
///
/// A URL's component is taken before it is decoded, so that an encoded "/" belongs to the name.
std::optional<std::string> QELFileName(const platform::Text& location,
                                       const std::optional<platform::Text>& referenceType);

/// Whether the last component of a location names a file at all.
bool QELNamesFile(std::string_view name);

/// The name without its extension and its colons; slashes become colons.
std::string QELBaseName(std::string_view name);

/// "BASE.EXTENSION", with the dot even when the extension is empty.
std::string QELNameWithExtension(std::string_view base, std::string_view extension);

/// Whether a file can have the name, and "Info.plist" hold it. A name like that of a file in the
/// making is none: the next run would take the file for one that was left behind.
bool QELIsSaneName(std::string_view name);
