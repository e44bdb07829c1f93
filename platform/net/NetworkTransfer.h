#pragma once

#include <array>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/net/MessageFraming.h"
#include "platform/net/TransferLibrary.h"
#include "platform/net/URL.h"
#include "platform/text/ErrorRecord.h"

namespace platform {

/// What is asked of a server beside the URL.
struct TransferRequest {
  std::string acceptedEncoding;  // the content coding that is asked for: "gzip", "identity"
  /// The length of a part that is there already, of which only the rest is wanted if the validator
  /// (a strong entity tag or a date) still holds. 0 for all.
  std::uint64_t offset = 0;
  std::string validator = {};
  /// The seconds without a byte after which it fails with CURLE_OPERATION_TIMEDOUT; 0 for no limit.
  int stallLimit = 0;
};

/// One http or https request and its answer. For the use of platform/ alone.
///
/// All transfers of a thread share its connections, which stay open between them; one on which
/// anything lies that was not asked for yet is given up. They make progress while the thread is in
/// runAll(). A final status of 200 is success and nothing else is; any other is an error of the
/// domain "HTTP" with the status as its code. A header that does not tell where the body ends, or
/// that is longer than any honest one, is a failure. Destroying a running transfer cancels it; not
/// from within its sink.
///
/// At most 20 redirects are followed, each to where URL::resolved() says, http and https alone.
/// An answer that holds another part than was asked for, or none, is passed over, and everything
/// asked for anew. Cookies live as long as the transfer. User and password of the URL go to its own
/// scheme, host and port alone.
class NetworkTransfer {
 public:
  /// Takes the answer as it comes. Returning false with an error fails the transfer.
  class Sink {
   public:
    virtual ~Sink() = default;
    /// The header with the final status 200 has come, or that of the wanted part. `expectedLength`
    /// is that of the whole, -1 when unknown; offset() is where the bytes begin that come.
    virtual bool begin(std::int64_t expectedLength, const std::vector<std::string>& contentCodings,
                       ErrorSlot& error) = 0;
    /// The next bytes of the body, as they are sent.
    virtual bool take(std::string_view bytes, ErrorSlot& error) = 0;
  };

  /// Starts the transfer.
  NetworkTransfer(const URL& url, TransferRequest request, Sink& sink);
  ~NetworkTransfer();
  NetworkTransfer(const NetworkTransfer&) = delete;
  NetworkTransfer& operator=(const NetworkTransfer&) = delete;

  bool hasEnded() const { return ended_; }
  /// Why it failed; empty while it runs and when it ended well.
  const ErrorSlot& error() const { return error_; }

  /// The length of the part that is not sent again: that of the request or 0.
  std::uint64_t offset() const { return request_.offset; }
  /// The first field of this name in the answer's header, of any status; empty when there is none.
  std::string field(const char* name) const;

  /// Waits until something happens on one of the thread's transfers, without a deadline or no
  /// longer than the limit, and lets all of them proceed. False when none is running.
  static bool runAll(std::optional<std::chrono::milliseconds> limit = std::nullopt);

 private:
  class Connections;

  CURLcode configure();
  /// Asks for the URL, on a connection of its own if that is called for.
  void send(bool onNewConnection);
  bool hasLeftovers(int localPort) const;
  void end(CURLcode result);
  /// Sends the request to where a redirect leads; false, with the error, where it cannot.
  bool follow();
  int status() const;
  bool didReceiveHeaderLine(std::string_view line);
  bool didReceiveHeader();
  /// Whether the answer holds the bytes from the offset to the end, and is of the same file.
  bool isRest() const;
  CURLcode setFields();
  bool didReceiveBody(std::string_view bytes);
  /// What the library calls with bytes for one of these two; another size than theirs ends the
  /// transfer.
  template <bool (NetworkTransfer::*didReceive)(std::string_view)>
  static std::size_t callback(char* bytes, std::size_t size, std::size_t count, void* transfer);

  TransferRequest request_;
  Sink& sink_;
  URL firstURL_;
  URL url_;  // that is being asked for
  int redirects_ = 0;
  ErrorSlot error_;
  bool ended_ = false;
  bool begun_ = false;        // whether the status 200 has come
  bool refused_ = false;      // whether the connection had leftovers
  bool isOtherPart_ = false;  // whether everything is to be asked for anew
  std::string location_;      // of a redirect
  MessageFraming framing_;
  std::uint64_t headerSize_ = 0;   // of all answers so far, trailers included
  std::uint64_t ignoredSize_ = 0;  // of the body of another status
  std::array<char, CURL_ERROR_SIZE> errorText_{};
  std::unique_ptr<curl_slist, void (*)(curl_slist*)> fields_{nullptr, nullptr};
  std::unique_ptr<CURL, void (*)(CURL*)> handle_{nullptr, nullptr};
};

}  // namespace platform
