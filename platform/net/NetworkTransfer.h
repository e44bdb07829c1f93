#pragma once

#include <array>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/net/MessageFraming.h"
#include "platform/net/TransferLibrary.h"
#include "platform/net/URL.h"
#include "platform/text/ErrorRecord.h"

namespace platform {

/// One http or https request and its answer. For the use of platform/ alone.
///
/// All transfers of a thread share its connections, which stay open between them. They make
/// progress while the thread is in runAll(). A final status of 200 is success and nothing else is;
/// any other is an error of the domain "HTTP" with the status as its code. A header that does not
/// tell where the body ends, or that is longer than any honest one, is a failure. Destroying a
/// running transfer cancels it; not from within its sink.
class NetworkTransfer {
 public:
  /// Takes the answer as it comes. Returning false with an error fails the transfer.
  class Sink {
   public:
    virtual ~Sink() = default;
    /// The header with the final status 200 has come. `expectedLength` is -1 when unknown.
    virtual bool begin(std::int64_t expectedLength, std::string_view contentEncoding,
                       ErrorSlot& error) = 0;
    /// The next bytes of the body, as they are sent.
    virtual bool take(std::string_view bytes, ErrorSlot& error) = 0;
  };

  /// Starts the transfer. `acceptedEncoding` is a content coding such as "gzip" that the sink
  /// understands, null for none.
  NetworkTransfer(const URL& url, const char* acceptedEncoding, Sink& sink);
  ~NetworkTransfer();
  NetworkTransfer(const NetworkTransfer&) = delete;
  NetworkTransfer& operator=(const NetworkTransfer&) = delete;

  bool hasEnded() const { return ended_; }
  /// Why it failed; empty while it runs and when it ended well.
  const ErrorSlot& error() const { return error_; }

  /// Waits until something happens on one of the thread's transfers, without a deadline or no
  /// longer than the limit, and lets all of them proceed. False when none is running.
  static bool runAll(std::optional<std::chrono::milliseconds> limit = std::nullopt);

 private:
  class Connections;

  CURLcode configure(const URL& url, const char* acceptedEncoding);
  void end(CURLcode result);
  int status() const;
  bool didReceiveHeaderLine(std::string_view line);
  bool didReceiveHeader();
  bool didReceiveBody(std::string_view bytes);
  /// What the library calls with bytes for one of these two; another size than theirs ends the
  /// transfer.
  template <bool (NetworkTransfer::*didReceive)(std::string_view)>
  static std::size_t callback(char* bytes, std::size_t size, std::size_t count, void* transfer);

  Sink& sink_;
  ErrorSlot error_;
  bool ended_ = false;
  bool begun_ = false;  // whether the status 200 has come
  MessageFraming framing_;
  std::uint64_t headerSize_ = 0;   // of all answers so far, trailers included
  std::uint64_t ignoredSize_ = 0;  // of the body of another status
  std::array<char, CURL_ERROR_SIZE> errorText_{};
  std::unique_ptr<CURL, void (*)(CURL*)> handle_{nullptr, nullptr};
};

}  // namespace platform
