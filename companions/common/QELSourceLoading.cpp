#include "companions/common/QELSourceLoading.h"

#include <filesystem>
#include <system_error>

#include "cli/QELSourceResolution.h"
#include "cli/common/QELError.h"
#include "platform/files/Paths.h"
#include "platform/text/Case.h"

bool QELIsOnNetwork(const std::string& source) {
  return source.starts_with("http") || source.starts_with("pcast");
}

std::string QELLastingSource(const std::string& source) {
  if (QELIsOnNetwork(source) || source.starts_with("file:")) return source;
  std::error_code ignored;
  return std::filesystem::absolute(source, ignored).lexically_normal().string();
}

std::unique_ptr<QELPodcastSource> QELLoadedSource(const std::string& source,
                                                  const QELDirectory& directory, int stallLimit,
                                                  platform::ErrorSlot& error) {
  std::unique_ptr<QELPodcastSource> made;
  if (QELValidateSource(source, false)) {
    made = initWithSourceString(source, {directory.prefix}, stallLimit);
  }
  if (!made) {
    error = QELError(1, "it is no feed, and no reference file or bundle that can be read");
    return nullptr;
  }
  if (!made->loadSourceWithError(error)) return nullptr;
  const bool isBundle = platform::lowercased(platform::pathExtension(source)) == "podcast";
  if (!isBundle || QELIsOnNetwork(source) || !made->episodes()) return made;
  for (const auto& episode : *made->episodes()) {
    const QELMediaReference poster = episode->posterReference();
    if (!poster.location || poster.location->empty() || poster.isRemote) continue;
    episode->setPosterLocation(platform::joinedPath(source, *poster.location));
  }
  return made;
}
