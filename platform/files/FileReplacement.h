#pragma once

#include <string>
#include <string_view>

#include "platform/text/ErrorRecord.h"

namespace platform {

/// Makes the bytes the whole content of the file at the path. False with the slot filled, and the
/// file as it was, on failure.
///
/// They are written beside it and are on the disk before they take its name, in one step: whoever
/// reads the file, and whoever finds it after the power went, has the old content or the new one. A
/// file that was there hands its permissions on (see Directory::attributesForSuccessor). Where the
/// path is a symbolic link, dangling or not, the file that it leads to is the one that is replaced.
///
/// What exists and is no regular file (a FIFO, a device) is written itself, as are open descriptors
/// that have a path (/dev/fd/3) and the standard output (kStandardOutputPath, "-"): then a failure
/// may leave a part of the bytes there.
bool replaceFile(const std::string& path, std::string_view bytes, ErrorSlot& error);

}  // namespace platform
