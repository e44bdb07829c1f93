#pragma once

#include <functional>
#include <optional>
#include <string>

#include "platform/net/Download.h"
#include "platform/text/Text.h"

/// The state of a record's running download, which its events change and its wait watches.
struct QELDownloadState {
  bool downloadFinished = false;  // ended, well or badly
  bool downloadSuccess = false;   // ended well
};

/// Puts what lies at the location to the path, and returns once it is there or has failed (false).
///
/// Exactly the reference type "remote" means a download, which replaces what is at the path; any
/// other and none mean the copy of a file, which does not. A missing location and a remote one that
/// is no valid URL fail at once. Before a download `willDownload` is called and the state reset;
/// then `receiver` gets the download's events on this thread and must note its end in the state.
bool QELFetchToPath(const std::optional<platform::Text>& location,
                    const std::optional<platform::Text>& referenceType, const std::string& path,
                    platform::DownloadReceiver& receiver, QELDownloadState& state,
                    const std::function<void()>& willDownload);
