#include "companions/common/QELSourceLoading.h"

#include <filesystem>
#include <system_error>

#include "cli/QELSourceResolution.h"
#include "cli/common/QELError.h"
#include "platform/files/FileManager.h"
#include "platform/files/Paths.h"
#include "platform/net/URL.h"
#include "platform/net/URLFault.h"
#include "platform/text/Case.h"

namespace {

/// What is wrong with the name of a source that is none.
std::string faultOf(const std::string& source) {
  const std::string url = QELURLTextOf(source).value_or(source);
  if (platform::looksLikeURL(url)) {
    const std::string fault = platform::hasFetchedScheme(url) ? platform::urlFault(url) : "";
    return fault.empty() ? "a URL begins with http:, https: or file:, in lower case" : fault;
  }
  if (platform::fileExists(source)) {
    return "it is no reference file or bundle; a feed on the disk is named by a file:/// URL";
  }
  return "it is no feed, and no reference file or bundle that can be read";
}

/// The location, a local one below the directory.
platform::OptionalText below(const std::string& directory, const QELMediaReference& reference) {
  const platform::OptionalText& location = reference.location;
  if (!location || location->empty() || reference.isRemote) return location;
  if (platform::isAbsolutePath(*location) || platform::looksLikeURL(*location)) return location;
  return platform::joinedPath(directory, *location);
}

}  // namespace

bool QELIsOnNetwork(const std::string& source) {
  return source.starts_with("http") || source.starts_with("pcast");
}

bool QELIsSourceItself(const std::string& file, const std::string& source) {
  std::error_code ignored;
  const auto url = platform::URL::parse(source);
  const std::string path = url && url->scheme() == "file" ? url->path() : source;
  return std::filesystem::equivalent(file, path, ignored) ||
         std::filesystem::equivalent(file, platform::joinedPath(path, "Info.plist"), ignored);
}

std::string QELLastingName(const std::string& source) {
  if (QELURLTextOf(source)) return source;
  std::error_code failure;
  const std::filesystem::path absolute = std::filesystem::absolute(source, failure);
  if (failure) return source;
  std::filesystem::path lasting;
  for (const std::filesystem::path& part : absolute) {
    if (part == "..") {
      // It leads out of where a link leads to. Other links may lead elsewhere tomorrow.
      if (std::filesystem::is_symlink(lasting, failure)) {
        lasting = std::filesystem::weakly_canonical(lasting, failure);
      }
      lasting = lasting.parent_path();
    } else if (part != ".") {
      lasting /= part;
    }
  }
  return lasting.string();
}

std::unique_ptr<QELPodcastSource> QELLoadedSource(const std::string& source,
                                                  const QELDirectory& directory, int stallLimit,
                                                  platform::ErrorSlot& error) {
  std::unique_ptr<QELPodcastSource> made;
  if (QELValidateSource(source, false)) {
    made = initWithSourceString(source, {directory.prefix}, stallLimit);
  }
  if (!made) {
    error = QELError(1, faultOf(source));
    return nullptr;
  }
  if (!made->loadSourceWithError(error)) return nullptr;
  if (QELURLTextOf(source)) return made;
  const bool isBundle = platform::lowercased(platform::pathExtension(source)) == "podcast";
  const std::string folder =
      isBundle ? source : std::filesystem::path(QELLastingName(source)).parent_path().string();
  if (!isBundle) made->setPosterLocation(below(folder, made->posterReference()));
  if (!made->episodes()) return made;
  for (const auto& episode : *made->episodes()) {
    if (!isBundle) episode->setLocation(below(folder, episode->mediaReference()));
    episode->setPosterLocation(below(folder, episode->posterReference()));
  }
  return made;
}
