#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "model/QELMediaReference.h"

/// The rules that decide the name of a media file or a poster of a bundle, after the location that
/// it comes from. They go by texts alone; nothing here looks at the file system.
///
///     const auto name = QELFileName(reference);      // of "https://h/a%20b:1.MP3?x": "a b:1.MP3"
///     const auto base = ledger.reserve(QELBaseName(*name));  // "a b1", or "a b1-2" when taken
///     const auto file = QELNameWithExtension(base, platform::pathExtension(*name));  // "a b1.MP3"
///     if (!QELNamesFile(*name) || !QELIsSaneName(file)) skip();

/// The last component of a location: of the decoded path for a URL, of the path itself otherwise.
/// Absent without a location and for a remote one that is no valid URL.
///
/// A URL's component is taken before it is decoded, so that an encoded "/" belongs to the name.
std::optional<std::string> QELFileName(const QELMediaReference& reference);

/// Whether the last component of a location names a file at all.
bool QELNamesFile(std::string_view name);

/// The name without its extension and its colons; slashes become colons.
std::string QELBaseName(std::string_view name);

/// "BASE.EXTENSION", with the dot even when the extension is empty.
std::string QELNameWithExtension(std::string_view base, std::string_view extension);

/// Whether a file can have the name, and "Info.plist" hold it. A name like that of a file in the
/// making is none: the next run would take the file for one that was left behind.
bool QELIsSaneName(std::string_view name);
