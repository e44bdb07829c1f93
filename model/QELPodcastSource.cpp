#include "model/QELPodcastSource.h"

#include "cli/common/QELError.h"
#include "cli/common/QELProgress.h"

bool QELPodcastSource::loadSourceWithError(platform::ErrorSlot& error) {
  error = QELError(1, "Attempt to load an abstract source");
  return false;
}

bool QELPodcastSource::savePosterToPath(const std::string& path) {
  return QELFetchToPath(posterLocation(), posterReferenceType(), path, *this, download_, [this] {
    QELProgress("N", "Downloading poster for podcast entitled \"%@\"...", title());
  });
}

void QELPodcastSource::downloadDidFinish(platform::Download& /*download*/) {
  download_ = {.downloadFinished = true, .downloadSuccess = true};
}

void QELPodcastSource::didFailWithError(platform::Download& /*download*/,
                                        const platform::ErrorRecord& /*error*/) {
  download_ = {.downloadFinished = true, .downloadSuccess = false};
}
