#pragma once

#include <memory>
#include <utility>

#include "generators/QELPodcastGenerator.h"
#include "platform/plist/PropertyListValue.h"

/// Turns a source into the reference dictionary of a reference file.
class QELReferenceFilePodcastGenerator : public QELPodcastGenerator {
 public:
  /// Builds the dictionary: each of the twelve "Podcast" keys whose field is present, as it stands,
  /// and "Episodes" when there is at least one. The allowed file types are not carried over. Never
  /// fails.
  bool generateFromSource(QELPodcastSource& source, platform::ErrorSlot& error) override;

  /// The dictionary of the last generation; null before the first.
  const std::shared_ptr<const platform::Dictionary>& referenceData() const {
    return referenceData_;
  }
  void setReferenceData(std::shared_ptr<const platform::Dictionary> data) {
    referenceData_ = std::move(data);
  }

 private:
  std::shared_ptr<const platform::Dictionary> referenceData_;
};
