#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "platform/files/Directory.h"
#include "platform/text/ByteSource.h"
#include "platform/text/ErrorRecord.h"

namespace platform {

/// The largest document that is read into memory: 2 GiB.
inline constexpr std::size_t kWholeReadLimit = std::size_t{2} << 30U;

/// Whether anything (file, directory, ...) exists at the path, symbolic links followed.
bool fileExists(const std::string& path);

/// The whole content of a regular file, read as it is wanted. Anything else (directory, device,
/// FIFO, socket) and a file over kWholeReadLimit give no value and fill the slot; a file that grows
/// beyond the limit meanwhile fails like one that cannot be read any further.
std::optional<ByteSource> openWholeFile(const std::string& path, ErrorSlot& error);

/// The paths of all that lies below the directory, relative to it and sorted, but for the
/// directories themselves. A hidden directory is named and not looked into, and no link is
/// followed. No value, and the slot filled, on failure.
std::optional<std::vector<std::string>> filesBelow(const std::string& directory, ErrorSlot& error);

/// Whether what is at the path lies in the directory or below it, links followed; true as well when
/// one of them cannot be looked at.
bool liesBelow(const std::string& path, const std::string& directory);

/// Creates the directory and all missing parents; an existing directory is accepted.
bool createDirectories(const std::string& path, ErrorSlot& error);

/// Copies a regular file to a place at which nothing exists yet (not even a dangling symbolic
/// link). The copy appears under its name whole and on the disk, with the permissions and the time
/// of the original, or not at all. An original that changes meanwhile is a failure. False, and the
/// slot filled, on failure.
bool copyFile(const std::string& source, const FilePlace& place, ErrorSlot& error);
bool copyFile(const std::string& source, const FilePlace& place);

}  // namespace platform
