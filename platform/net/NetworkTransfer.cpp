#include "platform/net/NetworkTransfer.h"

#include <climits>
#include <list>
#include <mutex>
#include <vector>

namespace platform {
namespace {

constexpr long kMaximumRedirects = 20;
constexpr long kReceiveBufferSize = 512L * 1024;
/// The library's largest, 24 days: the operating system gives up on a connection long before.
constexpr long kNoConnectTimeout = INT_MAX / 1000;
/// A short page with the reason of a failure is read to its end, which keeps the connection alive.
constexpr std::uint64_t kIgnoredBodyLimit = std::uint64_t{64} * 1024;
/// The library reads the page of a redirect by itself, and would do so for ever. Some servers send
/// the whole page that they meant to move away from.
constexpr std::int64_t kRedirectPageLimit = std::int64_t{16} * 1024 * 1024;
/// Of all answers of a transfer together; honest ones have a few KiB.
constexpr std::uint64_t kHeaderLimit = std::uint64_t{1} * 1024 * 1024;

/// Only called for a transfer, which is not begun without the library.
const TransferLibrary& library() {
  return *TransferLibrary::functions();
}

}  // namespace

/// The connections of one thread, and its transfers that are running.
class NetworkTransfer::Connections {
 public:
  /// They end with the process. To end them with their thread, the C library would have to take
  /// note of that, and aborts the process where it has no memory to.
  static Connections& ofThisThread() {
    library();  // what it set up ends behind the connections, as it began before them
    static std::mutex mutex;
    static std::list<Connections> ofAllThreads;
    static thread_local Connections* ofThread = nullptr;
    if (ofThread == nullptr) {
      const std::lock_guard lock(mutex);
      ofThread = &ofAllThreads.emplace_back();
    }
    return *ofThread;
  }

  CURLcode add(NetworkTransfer& transfer) {
    running_.push_back(&transfer);
    const CURLMcode code = library().multiAddHandle(handle_.get(), transfer.handle_.get());
    return code == CURLM_OK ? CURLE_OK : CURLE_FAILED_INIT;
  }

  void remove(NetworkTransfer& transfer) {
    library().multiRemoveHandle(handle_.get(), transfer.handle_.get());
    std::erase(running_, &transfer);
  }

  bool run(std::optional<std::chrono::milliseconds> limit) {
    if (running_.empty()) return false;
    int count = 0;
    const int longestWait = limit ? static_cast<int>(limit->count()) : INT_MAX;
    CURLMcode code = library().multiPoll(handle_.get(), nullptr, 0, longestWait, nullptr);
    if (code == CURLM_OK) code = library().multiPerform(handle_.get(), &count);
    if (code != CURLM_OK) {
      while (!running_.empty()) running_.back()->end(CURLE_FAILED_INIT);
      return true;
    }
    while (const CURLMsg* message = library().multiInfoRead(handle_.get(), &count)) {
      if (message->msg != CURLMSG_DONE) continue;
      const CURLcode result = message->data.result;
      void* transfer = nullptr;
      library().easyGetinfo(message->easy_handle, CURLINFO_PRIVATE, &transfer);
      static_cast<NetworkTransfer*>(transfer)->end(result);
    }
    return true;
  }

 private:
  std::unique_ptr<CURLM, decltype(library().multiCleanup)> handle_{library().multiInit(),
                                                                   library().multiCleanup};
  std::vector<NetworkTransfer*> running_;
};

NetworkTransfer::NetworkTransfer(const URL& url, const char* acceptedEncoding, Sink& sink)
    : sink_(sink) {
  if (url.scheme() != "http" && url.scheme() != "https") {
    error_ = transferError(CURLE_UNSUPPORTED_PROTOCOL,
                           "URLs of the scheme \"" + url.scheme() + "\" are not supported");
  } else {
    error_ = TransferLibrary::error();
  }
  ended_ = error_.has_value();
  if (ended_) return;
  Connections& connections = Connections::ofThisThread();
  CURLcode result = configure(url, acceptedEncoding);
  if (result == CURLE_OK) result = connections.add(*this);
  if (result != CURLE_OK) end(result);
}

NetworkTransfer::~NetworkTransfer() {
  if (!ended_) Connections::ofThisThread().remove(*this);
}

template <bool (NetworkTransfer::*didReceive)(std::string_view)>
std::size_t NetworkTransfer::callback(char* bytes, std::size_t size, std::size_t count,
                                      void* transfer) {
  const bool isTaken =
      (static_cast<NetworkTransfer*>(transfer)->*didReceive)({bytes, size * count});
  return isTaken ? size * count : 0;
}

CURLcode NetworkTransfer::configure(const URL& url, const char* acceptedEncoding) {
  handle_ = {library().easyInit(), library().easyCleanup};
  CURLcode result = CURLE_OK;
  const auto set = [this, &result](CURLoption option, auto value) {
    if (result == CURLE_OK) result = library().easySetopt(handle_.get(), option, value);
  };
  set(CURLOPT_PRIVATE, static_cast<void*>(this));
  set(CURLOPT_ERRORBUFFER, errorText_.data());
  set(CURLOPT_URL, url.encodedText().c_str());
  set(CURLOPT_PROTOCOLS_STR, "http,https");
  set(CURLOPT_REDIR_PROTOCOLS_STR, "http,https");
  set(CURLOPT_FOLLOWLOCATION, 1L);
  set(CURLOPT_MAXREDIRS, kMaximumRedirects);
  set(CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_1_1));
  set(CURLOPT_USERAGENT, "qel/" QEL_VERSION);
  // The sink undoes the coding itself: the library takes a stream that stops early for whole.
  set(CURLOPT_ACCEPT_ENCODING, acceptedEncoding);
  set(CURLOPT_HTTP_CONTENT_DECODING, 0L);
  set(CURLOPT_SUPPRESS_CONNECT_HEADERS, 1L);
  set(CURLOPT_NOSIGNAL, 1L);
  set(CURLOPT_CONNECTTIMEOUT, kNoConnectTimeout);
  set(CURLOPT_BUFFERSIZE, kReceiveBufferSize);
  set(CURLOPT_HEADERFUNCTION, &callback<&NetworkTransfer::didReceiveHeaderLine>);
  set(CURLOPT_HEADERDATA, static_cast<void*>(this));
  set(CURLOPT_WRITEFUNCTION, &callback<&NetworkTransfer::didReceiveBody>);
  set(CURLOPT_WRITEDATA, static_cast<void*>(this));
  const curl_xferinfo_callback progressCallback = [](void* self, curl_off_t, curl_off_t bodySize,
                                                     curl_off_t, curl_off_t) {
    const bool isIgnored = !static_cast<NetworkTransfer*>(self)->begun_;
    return isIgnored && bodySize > kRedirectPageLimit ? 1 : 0;
  };
  set(CURLOPT_XFERINFOFUNCTION, progressCallback);
  set(CURLOPT_XFERINFODATA, static_cast<void*>(this));
  set(CURLOPT_NOPROGRESS, 0L);
  return result;
}

int NetworkTransfer::status() const {
  long status = 0;
  library().easyGetinfo(handle_.get(), CURLINFO_RESPONSE_CODE, &status);
  return static_cast<int>(status);
}

void NetworkTransfer::end(CURLcode result) {
  Connections::ofThisThread().remove(*this);
  ended_ = true;
  if (error_) return;
  curl_off_t firstByteTime = 0;
  library().easyGetinfo(handle_.get(), CURLINFO_STARTTRANSFER_TIME_T, &firstByteTime);
  const bool isInHeader = firstByteTime > 0 && !begun_;
  // A failed status is the cause, however its page ended.
  const bool hasFailedStatus = !begun_ && (result == CURLE_OK || status() >= 400);
  if (!begun_ && result == CURLE_OK && status() == 200) {
    error_ = transferError(CURLE_PARTIAL_FILE, "The header of the answer is cut short");
  } else if (hasFailedStatus || ignoredSize_ > kIgnoredBodyLimit) {
    error_ = {"HTTP", status(), "HTTP status " + std::to_string(status())};
  } else if (result == CURLE_ABORTED_BY_CALLBACK) {
    error_ = transferError(CURLE_FILESIZE_EXCEEDED, "The page of a redirect is larger than 16 MiB");
  } else if (result == CURLE_OUT_OF_MEMORY && isInHeader) {
    // What the library says of a line beyond its limit.
    error_ = transferError(result, "A line of the answer's header is too long");
  } else if (result != CURLE_OK) {
    const std::string_view detail = errorText_.data();
    error_ = transferError(result, detail.empty() ? library().easyStrerror(result) : detail);
  }
}

bool NetworkTransfer::didReceiveHeaderLine(std::string_view line) {
  headerSize_ += line.size();
  if (headerSize_ > kHeaderLimit) {
    error_ = transferError(CURLE_FILESIZE_EXCEEDED, "The header is longer than 1 MiB");
    return false;
  }
  if (begun_) return true;  // behind the body
  framing_.takeLine(line);
  const bool endsHeader = line == "\r\n" || line == "\n";
  return !endsHeader || didReceiveHeader();
}

bool NetworkTransfer::didReceiveHeader() {
  const int status = this->status();
  const bool hasBody = status >= 200 && status != 204 && status != 304;
  if (hasBody && !framing_.fault().empty()) {
    if (status < 400) error_ = transferError(CURLE_PARTIAL_FILE, framing_.fault());
    return false;
  }
  if (status != 200) return true;
  begun_ = true;
  const std::optional<std::uint64_t> length = framing_.length();
  curl_header* coding = nullptr;
  library().easyHeader(handle_.get(), "Content-Encoding", 0, CURLH_HEADER, -1, &coding);
  return sink_.begin(length ? static_cast<std::int64_t>(*length) : -1,
                     coding != nullptr ? coding->value : "", error_);
}

bool NetworkTransfer::didReceiveBody(std::string_view bytes) {
  if (begun_) return sink_.take(bytes, error_);
  ignoredSize_ += bytes.size();
  return ignoredSize_ <= kIgnoredBodyLimit;
}

bool NetworkTransfer::runAll(std::optional<std::chrono::milliseconds> limit) {
  return Connections::ofThisThread().run(limit);
}

}  // namespace platform
