#include "platform/files/Paths.h"

#include <pwd.h>
#include <unistd.h>

#include <algorithm>
#include <cstddef>
#include <cstdlib>
#include <filesystem>
#include <system_error>
#include <vector>

#include "platform/files/PosixError.h"
#include "platform/text/Splitting.h"

namespace platform {
namespace {

constexpr std::string_view kWorkingDirectory = ".";
constexpr std::string_view kParentDirectory = "..";

/// The position of the dot before the extension, npos without one. A name of dots alone ("..") has
/// none.
std::size_t extensionDot(std::string_view component) {
  const std::size_t dot = component.rfind('.');
  const bool isDotsAlone = component.find_first_not_of('.') == std::string_view::npos;
  return dot == 0 || isDotsAlone ? std::string_view::npos : dot;
}

/// The home directory of a user, of the one who runs the process for an empty name; empty when it
/// cannot be told.
std::string homeDirectory(const std::string& user) {
  if (user.empty()) {
    if (const char* home = std::getenv("HOME"); home != nullptr && *home != '\0') return home;
  }
  const passwd* entry = user.empty() ? ::getpwuid(::getuid()) : ::getpwnam(user.c_str());
  return entry != nullptr && entry->pw_dir != nullptr ? entry->pw_dir : "";
}

/// A tilde whose home directory cannot be told is a name like any other.
std::string withTildeExpanded(std::string_view path) {
  if (!path.starts_with('~')) return std::string(path);
  const std::size_t end = std::min(path.find('/'), path.size());
  std::string home = homeDirectory(std::string(path.substr(1, end - 1)));
  return home.empty() ? std::string(path) : home.append(path.substr(end));
}

}  // namespace

std::string_view lastPathComponent(std::string_view path) {
  const std::string_view trimmedPath = path.substr(0, path.find_last_not_of('/') + 1);
  return trimmedPath.substr(trimmedPath.rfind('/') + 1);
}

std::string_view pathExtension(std::string_view path) {
  const std::string_view component = lastPathComponent(path);
  const std::size_t dot = extensionDot(component);
  return dot == std::string_view::npos ? std::string_view() : component.substr(dot + 1);
}

std::string_view pathWithoutExtension(std::string_view path) {
  const std::string_view component = lastPathComponent(path);
  const std::size_t dot = extensionDot(component);
  if (dot == std::string_view::npos) return path;
  return path.substr(0, static_cast<std::size_t>(component.data() - path.data()) + dot);
}

std::string joinedPath(std::string_view parent, std::string_view child) {
  if (parent.empty() || child.empty()) return std::string(parent.empty() ? child : parent);
  std::string joined(parent);
  joined.append("/").append(child);
  const auto isDoubledSeparator = [](char first, char second) {
    return first == '/' && second == '/';
  };
  joined.erase(std::unique(joined.begin(), joined.end(), isDoubledSeparator), joined.end());
  return joined;
}

bool isAbsolutePath(std::string_view path) {
  return path.starts_with('/');
}

std::string standardisedPath(std::string_view path) {
  const std::string expanded = withTildeExpanded(path);
  const bool isAbsolute = isAbsolutePath(expanded);
  std::vector<std::string_view> kept;
  for (const std::string_view component : splitAt(expanded, '/')) {
    if (component.empty() || component == kWorkingDirectory) continue;
    const bool isParent = component == kParentDirectory;
    if (isParent && !kept.empty() && kept.back() != kParentDirectory) {
      kept.pop_back();
    } else if (!isParent || !isAbsolute) {
      kept.push_back(component);
    }
  }
  std::string result;
  for (const std::string_view component : kept) {
    if (isAbsolute || !result.empty()) result += '/';
    result += component;
  }
  if (result.empty() && !expanded.empty()) return isAbsolute ? "/" : std::string(kWorkingDirectory);
  return result;
}

std::optional<std::string> currentDirectory(ErrorSlot& error) {
  std::error_code failure;
  const std::filesystem::path path = std::filesystem::current_path(failure);
  if (failure) {
    error = posixError(failure.value());
    return std::nullopt;
  }
  return path.string();
}

std::string temporaryDirectory() {
  const char* path = std::getenv("TMPDIR");
  return path != nullptr && *path != '\0' ? path : "/tmp";
}

}  // namespace platform
