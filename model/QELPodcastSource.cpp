#include "model/QELPodcastSource.h"

#include "cli/common/QELError.h"
#include "cli/common/QELProgress.h"

bool QELPodcastSource::loadSourceWithError(platform::ErrorSlot& error) {
  error = QELError(1, "Attempt to load an abstract source");
  return false;
}

bool QELPodcastSource::savePosterTo(const platform::FilePlace& place,
                                    const QELMediaReference& poster) {
  return fetchTo(place, poster, [this] {
    QELProgress("N", "Downloading poster for podcast entitled \"%@\"...", title());
  });
}
