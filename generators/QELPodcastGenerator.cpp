#include "generators/QELPodcastGenerator.h"

#include "cli/common/QELError.h"

bool QELPodcastGenerator::generateFromSource(QELPodcastSource& /*source*/,
                                             platform::ErrorSlot& error) {
  error = QELError(1, "Attempt to generate with an abstract generator");
  return false;
}
