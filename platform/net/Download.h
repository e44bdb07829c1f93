#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "platform/files/Directory.h"
#include "platform/net/URL.h"
#include "platform/text/ErrorRecord.h"

namespace platform {

class Download;

/// What the header of an answer tells beside its length, as it was sent; empty what it does not
/// tell.
struct DownloadAnswer {
  std::string entityTag;  // with its quotes: "\"5f3\"", or "W/\"5f3\"" for a weak one
  std::string lastModified;
  std::string contentType;
  std::string retryAfter;  // seconds, or a date of RFC 9110, section 5.6.7
  /// What lets a server prove later on that its file is still this one (RFC 9110, section 13.1.5):
  /// the strong entity tag, else a Last-Modified before the moment of the answer. Empty where there
  /// is neither, and for a body that came in a content coding.
  std::string validator;
};

/// What may be asked of a download beyond the plain case.
struct DownloadOptions {
  /// The name, in the destination's directory, of the file that holds the bytes until they are all
  /// there. It is left there when the download fails or the process ends, so that another can go on
  /// from it. Empty: a hidden name that no failure leaves behind.
  std::string partName = {};
  /// The validator of the answer that the part there came from. With it, only the rest is asked
  /// for; the download goes on behind the part where the server proves the file to be the same, and
  /// from the start otherwise. Empty, and where the place is a path: from the start.
  std::string partValidator = {};
  /// The seconds without a byte after which the download fails (domain "transfer", code 28), from
  /// the connecting on; 0 for no limit.
  int stallLimit = 0;
  /// Whether the destination may be replaced; if not, anything there fails the download.
  bool replaces = true;
};

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
/// at most 20 redirects, to http and https only; the body is asked for as it is (no compression),
/// and one that comes by gzip all the same is decompressed, with an expected length of -1.
/// file: regular files only, whose permissions and time are kept. No retry and no time-out.
/// Destroying a running download cancels it.
///
///     const Download download(*URL::parse("https://example.org/one.mp3"), "one.mp3", receiver);
///     while (!receiver.hasEnded() && runEventLoopOnce()) continue;  // which tells the receiver
class Download {
 public:
  /// Starts the transfer; its events come from runEventLoopOnce(). The receiver must outlive it.
  Download(const URL& url, const FilePlace& place, DownloadReceiver& receiver,
           DownloadOptions options = {});
  ~Download();
  Download(const Download&) = delete;
  Download& operator=(const Download&) = delete;

  /// What the answer told, from the response on, and of a failed status as well.
  const DownloadAnswer& answer() const { return answer_; }
  /// The length of the part that the download went on from, from the response on. The announced
  /// length includes it, the data events do not.
  std::uint64_t resumedLength() const { return resumedLength_; }

 private:
  class Transfer;
  class NetworkDownload;
  class FileDownload;
  DownloadAnswer answer_;
  std::uint64_t resumedLength_ = 0;
  std::unique_ptr<Transfer> transfer_;
};

/// Whether the failure of a download is one of the way to the server, of which the next try may
/// know nothing: no address or connection was had, or the connection ended before the body did, or
/// stalled. A failed status is of the domain "HTTP", with the status as its code.
bool isLostConnection(const ErrorRecord& error);

}  // namespace platform
