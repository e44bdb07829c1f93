#include "generators/QELBundleNames.h"

#include <algorithm>
#include <cstddef>

#include "platform/files/Paths.h"
#include "platform/files/TemporaryFile.h"
#include "platform/net/URL.h"
#include "platform/text/FormattedText.h"
#include "platform/xml/XMLEscaping.h"

std::optional<std::string> QELFileName(const QELMediaReference& reference) {
  if (reference.url) {
    return platform::percentDecoded(platform::lastPathComponent(reference.url->encodedPath()));
  }
  if (!reference.location || reference.isRemote) return std::nullopt;
  return std::string(platform::lastPathComponent(*reference.location));
}

bool QELNamesFile(std::string_view name) {
  return !name.empty() && name != "." && name != "..";
}

std::string QELBaseName(std::string_view name) {
  std::string base(platform::pathWithoutExtension(name));
  // Colons go first; otherwise those that slashes become would go, too.
  std::erase(base, ':');
  std::ranges::replace(base, '/', ':');
  return base;
}

std::string QELNameWithExtension(std::string_view base, std::string_view extension) {
  return platform::formattedText("%@.%@", {base, extension});
}

bool QELIsSaneName(std::string_view name) {
  constexpr std::size_t kLongestName = 255;  // bytes, what file systems allow
  return QELNamesFile(name) && name.size() <= kLongestName &&
         !platform::isTemporaryFileName(name) && name.find('/') == std::string_view::npos &&
         platform::isXMLText(name);
}
