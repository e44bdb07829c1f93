#pragma once

#include <cstdint>
#include <memory>

#include "platform/files/Directory.h"
#include "platform/net/URL.h"
#include "platform/text/ErrorRecord.h"

namespace platform {

class Download;

/// Receives the events of a Download, on the thread that started it, while that thread runs its
/// event loop. The order is: at most one response, any number of data events, then one finish or
/// failure.
class DownloadReceiver {
 public:
  virtual ~DownloadReceiver() = default;
  /// The answer to the request has come with a status of success. `expectedLength` is the announced
  /// number of bytes, -1 when unknown.
  virtual void didReceiveResponse(Download&, std::int64_t /*expectedLength*/) {}
  /// `length` more bytes have been written.
  virtual void didReceiveDataOfLength(Download&, std::uint64_t /*length*/) {}
  /// The file stands whole at its place.
  virtual void downloadDidFinish(Download& download) = 0;
  /// Nothing was changed at the place.
  virtual void didFailWithError(Download& download, const ErrorRecord& error) = 0;
};

/// The transfer of one URL (http, https, file:) into a file, overwriting what is there.
///
/// The bytes are written under a hidden name beside the destination, which is replaced in one step
/// once they are all there. http and https: a final status of 200 is success and nothing else is;
/// at most 20 redirects, to http and https only; the body is asked for as it is (no compression).
/// file: regular files only. No retry and no time-out. Destroying a running download cancels it.
///
///     const Download download(*URL::parse("https://example.org/one.mp3"), "one.mp3", receiver);
///     while (!receiver.hasEnded() && runEventLoopOnce()) continue;  // which tells the receiver
class Download {
 public:
  /// Starts the transfer; its events come from runEventLoopOnce(). The receiver must outlive it.
  Download(const URL& url, const FilePlace& place, DownloadReceiver& receiver);
  ~Download();
  Download(const Download&) = delete;
  Download& operator=(const Download&) = delete;

 private:
  class Transfer;
  class NetworkDownload;
  class FileDownload;
  std::unique_ptr<Transfer> transfer_;
};

}  // namespace platform
