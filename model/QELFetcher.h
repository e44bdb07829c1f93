#pragma once

#include <functional>

#include "model/QELMediaReference.h"
#include "platform/files/Directory.h"
#include "platform/net/Download.h"

/// A record that fetches what it refers to: it starts the download, receives its events and waits
/// for its end.
///
/// When a transfer counts as failed is decided below, in platform/net/NetworkTransfer.cpp.
class QELFetcher : protected platform::DownloadReceiver {
 public:
  QELFetcher(const QELFetcher&) = delete;
  QELFetcher& operator=(const QELFetcher&) = delete;

 protected:
  QELFetcher() = default;

  /// Puts what the reference leads to at the place, and returns once it is there or has failed
  /// (false). A path is copied, never over an existing file; a URL is downloaded over whatever is
  /// there, and its events come in between. A missing location and a remote one that is no valid
  /// URL fail at once; `willDownload` is called before a download.
  bool fetchTo(const platform::FilePlace& place, const QELMediaReference& reference,
               const std::function<void()>& willDownload);

 private:
  void downloadDidFinish(platform::Download& download) final;
  void didFailWithError(platform::Download& download, const platform::ErrorRecord& error) final;

  bool downloadFinished_ = false;  // ended, well or badly
  bool downloadSuccess_ = false;   // ended well
};
