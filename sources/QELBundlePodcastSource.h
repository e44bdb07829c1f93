#pragma once

#include <memory>
#include <optional>
#include <string>
#include <utility>

#include "model/QELPodcastSource.h"
#include "sources/QELReferenceFilePodcastSource.h"

/// A podcast source that reads a bundle: a directory with an "Info.plist" (a reference file) and
/// the media and posters that it names.
class QELBundlePodcastSource : public QELPodcastSource {
 public:
  /// A source for the bundle at the path, with its "Info.plist" read; null when either does not
  /// exist or "Info.plist" is no reference file.
  static std::unique_ptr<QELBundlePodcastSource> initWithPath(const std::string& path);

  /// Both are as `initWithPath` makes them; without one of them the source cannot be loaded.
  QELBundlePodcastSource(std::optional<std::string> bundlePath,
                         std::unique_ptr<QELReferenceFilePodcastSource> referenceFile)
      : bundlePath_(std::move(bundlePath)), referenceFile_(std::move(referenceFile)) {}

  /// Fills the fields from "Info.plist" and turns its locations into absolute paths inside the
  /// bundle, whatever their reference types say. Posters of episodes are left as they stand, and so
  /// stay relative to the working directory. The episodes are changed in place: load once.
  bool loadSourceWithError(platform::ErrorSlot& error) override;

 private:
  std::optional<std::string> bundlePath_;
  std::unique_ptr<QELReferenceFilePodcastSource> referenceFile_;
};
