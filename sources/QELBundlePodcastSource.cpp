#include "sources/QELBundlePodcastSource.h"

#include "cli/common/QELError.h"
#include "cli/common/QELReferenceType.h"
#include "model/QELPodcastKeys.h"
#include "platform/files/FileManager.h"
#include "platform/files/Paths.h"
#include "platform/text/Text.h"

namespace {

/// The path made absolute and standardised; absent, and the slot filled, when the working directory
/// cannot be told.
std::optional<std::string> absolutePath(const std::string& path, platform::ErrorSlot& error) {
  if (platform::isAbsolutePath(path)) return platform::standardisedPath(path);
  const std::optional<std::string> directory = platform::currentDirectory(error);
  if (!directory) return std::nullopt;
  return platform::standardisedPath(platform::joinedPath(*directory, path));
}

}  // namespace

std::unique_ptr<QELBundlePodcastSource> QELBundlePodcastSource::initWithPath(
    const std::string& path) {
  const std::string referencePath = platform::joinedPath(path, "Info.plist");
  if (!platform::fileExists(path) || !platform::fileExists(referencePath)) return nullptr;
  auto referenceFile = QELReferenceFilePodcastSource::initWithPath(referencePath);
  platform::ErrorSlot dropped;
  if (!referenceFile || !referenceFile->loadSourceWithError(dropped)) return nullptr;
  return std::make_unique<QELBundlePodcastSource>(path, std::move(referenceFile));
}

bool QELBundlePodcastSource::loadSourceWithError(platform::ErrorSlot& error) {
  if (!bundlePath_ || !referenceFile_) {
    error = QELError(1, "Attempted to initialize a bundle source without a path or reference file");
    return false;
  }

  const std::optional<std::string> bundle = absolutePath(*bundlePath_, error);
  if (!bundle) return false;

  static const platform::Text local(kReferenceTypeLocal);
  for (const QELPodcastKey& field : QELPodcastDescriptiveKeys()) {
    (this->*field.setValue)((*referenceFile_.*field.value)());
  }
  setReferenceType(local);
  setLocation(*bundle);
  if (const auto& poster = referenceFile_->posterLocation()) {
    setPosterReferenceType(local);
    setPosterLocation(platform::joinedPath(*bundle, *poster));
  }
  if (const auto& episodes = referenceFile_->episodes()) {
    for (const auto& episode : *episodes) {
      const auto location = episode->location();
      if (!location) continue;
      episode->setReferenceType(local);
      episode->setLocation(platform::joinedPath(*bundle, *location));
    }
    setEpisodes(episodes);
  }
  setAllowedPosterFileTypes(referenceFile_->allowedPosterFileTypes());
  setAllowedEpisodeFileTypes(referenceFile_->allowedEpisodeFileTypes());
  return true;
}
