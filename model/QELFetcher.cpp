#include "model/QELFetcher.h"

#include "platform/files/FileManager.h"
#include "platform/net/EventLoop.h"

bool QELFetcher::fetchTo(const platform::FilePlace& place, const QELMediaReference& reference,
                         const std::function<void()>& willDownload) {
  if (!reference.location) return false;
  if (!reference.isRemote) return platform::copyFile(reference.location->string(), place);
  if (!reference.url) return false;

  willDownload();
  downloadFinished_ = downloadSuccess_ = false;
  const platform::Download download(*reference.url, place, *this);
  while (!downloadFinished_ && platform::runEventLoopOnce()) {
  }
  return downloadSuccess_;
}

void QELFetcher::downloadDidFinish(platform::Download& /*download*/) {
  downloadFinished_ = downloadSuccess_ = true;
}

void QELFetcher::didFailWithError(platform::Download& /*download*/,
                                  const platform::ErrorRecord& /*error*/) {
  downloadFinished_ = true;
}
