#pragma once

#include "cli/common/QELError.h"
#include "model/QELPodcastSource.h"
#include "platform/text/ErrorRecord.h"

/// The abstract generator: given one loaded source, it leaves one output form of it in a property
/// of its own. Made, asked to generate once, read and dropped; used by one thread.
class QELPodcastGenerator {
 public:
  QELPodcastGenerator() = default;
  virtual ~QELPodcastGenerator() = default;
  QELPodcastGenerator(const QELPodcastGenerator&) = delete;
  QELPodcastGenerator& operator=(const QELPodcastGenerator&) = delete;

  /// Builds the output. False with the slot filled on failure. The base, which has no output,
  /// always fails with code 1.
  virtual bool generateFromSource(QELPodcastSource& /*source*/, platform::ErrorSlot& error) {
    error = QELError(1, "Attempt to generate with an abstract generator");
    return false;
  }
};
