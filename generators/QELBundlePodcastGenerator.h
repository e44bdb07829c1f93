#pragma once

#include <optional>
#include <string>
#include <utility>

#include "generators/QELPodcastGenerator.h"

/// Turns a source into a podcast bundle: a directory with every episode's media, every poster (in
/// "Posters") and an "Info.plist", a reference file whose locations all point inside the bundle.
///
/// QELBundleNames.h says how the files are named. An episode that cannot be fetched is warned about
/// and left out; a poster that cannot is warned about and left out of its entry. Files already in
/// the directory stay unless a download replaces them. Nothing is written outside the directory,
/// whatever the source's names look like.
class QELBundlePodcastGenerator : public QELPodcastGenerator {
 public:
  /// Builds the bundle at `outputPath`. Fails without an output path (code 1), when the directory
  /// cannot be created (code 2) and when "Info.plist" cannot be written (code 1); what was fetched
  /// by then stays.
  bool generateFromSource(QELPodcastSource& source, platform::ErrorSlot& error) override;

  /// The bundle's directory, created with its parents where it is missing.
  const std::optional<std::string>& outputPath() const { return outputPath_; }
  void setOutputPath(std::optional<std::string> path) { outputPath_ = std::move(path); }

 private:
  std::optional<std::string> outputPath_;
};
