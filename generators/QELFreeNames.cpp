#include "generators/QELFreeNames.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <filesystem>
#include <system_error>

#include "platform/text/ASCII.h"
#include "platform/text/Case.h"
#include "platform/text/Characters.h"
#include "platform/xml/XMLEscaping.h"

namespace {

constexpr std::size_t kLongestName = 255;      // bytes
constexpr std::size_t kLongestExtension = 32;  // of which this is not to take most

/// What no name may hold on one system or another, or in a reference file, becomes "_"; no name
/// begins as a hidden one or ends as Windows cuts it off.
std::string portableText(std::string_view text) {
  std::string portable;
  for (std::size_t position = 0; position < text.size();) {
    const std::size_t begin = position;
    const std::int32_t character = platform::nextCharacter(text, position);
    const std::string_view bytes = text.substr(begin, position - begin);
    const bool isReserved = character < ' ' || character == 0x7F || !platform::isXMLText(bytes) ||
                            (bytes.size() == 1 &&
                             std::string_view("<>:\"/\\|?*").find(bytes) != std::string_view::npos);
    portable.append(isReserved ? "_" : bytes);
  }
  portable.erase(0, std::min(portable.find_first_not_of(". "), portable.size()));
  portable.erase(portable.find_last_not_of(". ") + 1);
  return portable;
}

/// The names of devices, which Windows finds in every directory and with every extension.
bool isDevice(std::string_view name) {
  constexpr std::array kDevices = {"con", "prn", "aux", "nul"};
  const std::string stem = platform::lowercased(name.substr(0, name.find('.')));
  if (std::find(kDevices.begin(), kDevices.end(), stem) != kDevices.end()) return true;
  return stem.size() == 4 && (stem.starts_with("com") || stem.starts_with("lpt")) &&
         platform::isASCIIDigit(stem[3]);
}

void cutTo(std::string& text, std::size_t size) {
  while (text.size() > size) {
    // A character whose rest is cut off goes as a whole.
    const bool isContinuation = (static_cast<unsigned char>(text[size]) & 0xC0U) == 0x80;
    if (isContinuation && size > 0) {
      --size;
    } else {
      text.resize(size);
    }
  }
}

}  // namespace

void QELFreeNames::take(std::string_view name) {
  taken_.insert(platform::caseFolded(name));
}

void QELFreeNames::takeAllOf(const std::string& path) {
  std::error_code ignored;
  for (const auto& entry : std::filesystem::directory_iterator(path, ignored)) {
    take(entry.path().filename().string());
  }
}

std::string QELFreeNames::reserve(std::string_view base, std::string_view extension) {
  std::string stem = portableText(base);
  if (stem.empty()) stem = "episode";
  if (isDevice(stem)) stem = std::string("_").append(stem);
  std::string suffix = portableText(extension);
  cutTo(suffix, kLongestExtension);
  if (!suffix.empty()) suffix = std::string(".").append(suffix);

  std::uint64_t& number =
      nextNumbers_.try_emplace(platform::caseFolded(stem + suffix), 1).first->second;
  for (;; ++number) {
    std::string ending = suffix;
    if (number > 1) ending = std::string("-").append(std::to_string(number)).append(suffix);
    std::string name = stem;
    cutTo(name, kLongestName - ending.size());
    name += ending;
    if (taken_.insert(platform::caseFolded(name)).second) return name;
  }
}
