#include "model/QELFetch.h"

#include "cli/common/QELReferenceType.h"
#include "platform/files/FileManager.h"
#include "platform/net/EventLoop.h"
#include "platform/net/URL.h"

bool QELFetchToPath(const std::optional<platform::Text>& location,
                    const std::optional<platform::Text>& referenceType, const std::string& path,
                    platform::DownloadReceiver& receiver, QELDownloadState& state,
                    const std::function<void()>& willDownload) {
  if (!location) return false;
  if (referenceType != kReferenceTypeRemote) return platform::copyFile(location->string(), path);
  const std::optional<platform::URL> url = platform::URL::parse(*location);
  if (!url) return false;

  willDownload();
  state = QELDownloadState();
  const platform::Download download(*url, path, receiver);
  while (!state.downloadFinished && platform::runEventLoopOnce()) {
  }
  return state.downloadSuccess;
}
