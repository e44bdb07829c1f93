#include "platform/files/PortablePaths.h"

#include <algorithm>
#include <array>
#include <vector>

#include "platform/files/Paths.h"
#include "platform/text/Case.h"
#include "platform/text/Splitting.h"

namespace platform {
namespace {

/// Whether some file system has no such name.
bool isReserved(std::string_view component) {
  const auto isForbidden = [](char c) {
    return static_cast<unsigned char>(c) < 0x20 ||
           std::string_view(":\\*?\"<>|").find(c) != std::string_view::npos;
  };
  if (std::any_of(component.begin(), component.end(), isForbidden)) return true;
  if (component.ends_with('.') || component.ends_with(' ')) return true;
  const std::string base = lowercased(component.substr(0, component.find('.')));
  constexpr std::array<std::string_view, 4> kDevices = {"con", "prn", "aux", "nul"};
  const bool isNumbered = base.size() == 4 &&
                          (base.starts_with("com") || base.starts_with("lpt")) && base[3] >= '1' &&
                          base[3] <= '9';
  return isNumbered || std::find(kDevices.begin(), kDevices.end(), base) != kDevices.end();
}

}  // namespace

std::optional<std::string> pathInside(std::string_view path) {
  std::vector<std::string_view> components;
  for (const std::string_view component : splitAt(path, '/')) {
    if (component.empty() || component == ".") continue;
    if (component != "..") {
      components.push_back(component);
    } else if (components.empty()) {
      return std::nullopt;
    } else {
      components.pop_back();
    }
  }
  std::string name;
  for (const std::string_view component : components) name = joinedPath(name, component);
  return name;
}

bool isPortablePath(std::string_view path) {
  const std::vector<std::string_view> components = splitAt(path, '/');
  return std::none_of(components.begin(), components.end(), isReserved);
}

}  // namespace platform
