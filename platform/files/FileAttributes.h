#pragma once

#include <ctime>
#include <optional>

namespace platform {

/// The permission bits of a mode; those that lend the owner's rights to whoever runs a file are not
/// handed on.
inline constexpr unsigned kPermissions = 0777;

/// What a file takes over from another whose copy or successor it is.
struct FileAttributes {
  unsigned mode;                     // the permission bits
  std::optional<timespec> modified;  // the time of the last change
};

}  // namespace platform
