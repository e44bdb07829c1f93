#include "platform/net/NetworkTransfer.h"

#include <netinet/in.h>
#include <sys/socket.h>

#include <algorithm>
#include <climits>
#include <cstdlib>
#include <limits>
#include <list>
#include <mutex>
#include <utility>

#include "platform/text/ASCII.h"
#include "platform/text/Case.h"

namespace platform {
namespace {

constexpr int kMaximumRedirects = 20;
constexpr long kReceiveBufferSize = 512L * 1024;
/// The library's largest, 24 days: the operating system gives up on a connection long before.
constexpr long kNoConnectTimeout = INT_MAX / 1000;
/// A short page of a redirect or a failure is read to its end, which keeps the connection alive.
constexpr std::uint64_t kIgnoredBodyLimit = std::uint64_t{64} * 1024;
/// Of all answers of a transfer together; honest ones have a few KiB.
constexpr std::uint64_t kHeaderLimit = std::uint64_t{1} * 1024 * 1024;

/// Only called for a transfer, which is not begun without the library.
const TransferLibrary& library() {
  return *TransferLibrary::functions();
}

/// The variable's value; null also where it is empty.
const char* nonEmptyVariable(const char* name) {
  const char* const value = std::getenv(name);
  return value != nullptr && *value != '\0' ? value : nullptr;
}

/// Whom users tell to trust beside or in place of the system's authorities. The library reads none
/// of these variables; its command-line tool does, in this order.
const char* fileOfAuthorities() {
  const char* const bundle = nonEmptyVariable("CURL_CA_BUNDLE");
  return bundle != nullptr ? bundle : nonEmptyVariable("SSL_CERT_FILE");
}

const char* directoryOfAuthorities() {
  return nonEmptyVariable("CURL_CA_BUNDLE") != nullptr ? nullptr : nonEmptyVariable("SSL_CERT_DIR");
}

/// The local port of an internet socket; -1 for anything else.
int portOf(int socket) {
  sockaddr_storage address{};
  socklen_t size = sizeof(address);
  if (::getsockname(socket, reinterpret_cast<sockaddr*>(&address), &size) != 0) return -1;
  if (address.ss_family == AF_INET) return ntohs(reinterpret_cast<sockaddr_in&>(address).sin_port);
  if (address.ss_family != AF_INET6) return -1;
  return ntohs(reinterpret_cast<sockaddr_in6&>(address).sin6_port);
}

bool isSupported(const URL& url, ErrorSlot& error) {
  if (url.scheme() == "http" || url.scheme() == "https") return true;
  error = transferError(CURLE_UNSUPPORTED_PROTOCOL,
                        "URLs of the scheme \"" + url.scheme() + "\" are not supported");
  return false;
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

  void remember(int socket) {
    if (std::find(sockets_.begin(), sockets_.end(), socket) == sockets_.end()) {
      sockets_.push_back(socket);
    }
  }

  /// Whether there is anything to read, or the end, on a socket at that port of this machine; also
  /// where it is not known. In a callback the library does not tell the socket of a transfer.
  bool canBeRead(int localPort) const {
    bool isKnown = false;
    for (const int socket : sockets_) {
      if (portOf(socket) != localPort) continue;
      isKnown = true;
      char byte = 0;
      if (::recv(socket, &byte, 1, MSG_PEEK | MSG_DONTWAIT) >= 0) return true;
    }
    return !isKnown;
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
  std::vector<int> sockets_;  // all that were ever opened; their numbers come again
};

NetworkTransfer::NetworkTransfer(const URL& url, TransferRequest request, Sink& sink)
    : request_(std::move(request)), sink_(sink), firstURL_(url), url_(url) {
  if (!isSupported(url, error_)) {
    ended_ = true;
  } else if (TransferLibrary::error()) {
    error_ = TransferLibrary::error();
    ended_ = true;
  } else if (const CURLcode result = configure(); result != CURLE_OK) {
    end(result);
  } else {
    send(false);
  }
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

CURLcode NetworkTransfer::configure() {
  handle_ = {library().easyInit(), library().easyCleanup};
  CURLcode result = CURLE_OK;
  const auto set = [this, &result](CURLoption option, auto value) {
    if (result == CURLE_OK) result = library().easySetopt(handle_.get(), option, value);
  };
  set(CURLOPT_PRIVATE, static_cast<void*>(this));
  set(CURLOPT_ERRORBUFFER, errorText_.data());
  set(CURLOPT_PROTOCOLS_STR, "http,https");
  set(CURLOPT_COOKIEFILE, "");  // in memory
  set(CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_1_1));
  set(CURLOPT_USERAGENT, "qel/" QEL_VERSION);
  // The sink undoes the coding itself: the library takes a stream that stops early for whole.
  set(CURLOPT_ACCEPT_ENCODING, request_.acceptedEncoding.c_str());
  set(CURLOPT_HTTP_CONTENT_DECODING, 0L);
  set(CURLOPT_SUPPRESS_CONNECT_HEADERS, 1L);
  set(CURLOPT_NOSIGNAL, 1L);
  const long stallLimit = request_.stallLimit;
  set(CURLOPT_CONNECTTIMEOUT,
      stallLimit > 0 ? std::min(stallLimit, kNoConnectTimeout) : kNoConnectTimeout);
  set(CURLOPT_LOW_SPEED_LIMIT, 1L);
  set(CURLOPT_LOW_SPEED_TIME, stallLimit);
  set(CURLOPT_BUFFERSIZE, kReceiveBufferSize);
  set(CURLOPT_HEADERFUNCTION, &callback<&NetworkTransfer::didReceiveHeaderLine>);
  set(CURLOPT_HEADERDATA, static_cast<void*>(this));
  set(CURLOPT_WRITEFUNCTION, &callback<&NetworkTransfer::didReceiveBody>);
  set(CURLOPT_WRITEDATA, static_cast<void*>(this));
  const curl_prereq_callback willSendRequest = [](void* self, char*, char*, int, int localPort) {
    NetworkTransfer& transfer = *static_cast<NetworkTransfer*>(self);
    transfer.refused_ = transfer.hasLeftovers(localPort);
    return transfer.refused_ ? CURL_PREREQFUNC_ABORT : CURL_PREREQFUNC_OK;
  };
  if (const char* const file = fileOfAuthorities()) {
    set(CURLOPT_CAINFO, file);
    set(CURLOPT_PROXY_CAINFO, file);
  }
  if (const char* const directory = directoryOfAuthorities()) {
    set(CURLOPT_CAPATH, directory);
    set(CURLOPT_PROXY_CAPATH, directory);
  }
  set(CURLOPT_PREREQFUNCTION, willSendRequest);
  set(CURLOPT_PREREQDATA, static_cast<void*>(this));
  const curl_sockopt_callback didOpenSocket = [](void* connections, curl_socket_t socket,
                                                 curlsocktype) -> int {
    static_cast<Connections*>(connections)->remember(socket);
    return CURL_SOCKOPT_OK;
  };
  set(CURLOPT_SOCKOPTFUNCTION, didOpenSocket);
  set(CURLOPT_SOCKOPTDATA, static_cast<void*>(&Connections::ofThisThread()));
  return result;
}

void NetworkTransfer::send(bool onNewConnection) {
  errorText_.front() = '\0';
  location_.clear();
  ignoredSize_ = 0;
  CURLcode result = library().easySetopt(handle_.get(), CURLOPT_URL, url_.encodedText().c_str());
  if (result == CURLE_OK) {
    result = library().easySetopt(handle_.get(), CURLOPT_FRESH_CONNECT, onNewConnection ? 1L : 0L);
  }
  if (result == CURLE_OK) result = setFields();
  if (result == CURLE_OK) result = Connections::ofThisThread().add(*this);
  if (result != CURLE_OK) end(result);
}

CURLcode NetworkTransfer::setFields() {
  fields_ = {nullptr, library().slistFreeAll};
  if (request_.offset > 0) {
    const std::string range = "Range: bytes=" + std::to_string(request_.offset) + "-";
    for (const std::string& field : {range, "If-Range: " + request_.validator}) {
      curl_slist* const longer = library().slistAppend(fields_.get(), field.c_str());
      if (longer == nullptr) return CURLE_OUT_OF_MEMORY;
      if (!fields_) fields_.reset(longer);
    }
  }
  return library().easySetopt(handle_.get(), CURLOPT_HTTPHEADER, fields_.get());
}

/// Whether a kept connection has bytes that came before the request for which it is to be used, as
/// a body longer than announced leaves them there. They would be taken for the answer. The library
/// sees only whether the connection is still open.
bool NetworkTransfer::hasLeftovers(int localPort) const {
  long newConnections = 0;
  library().easyGetinfo(handle_.get(), CURLINFO_NUM_CONNECTS, &newConnections);
  if (newConnections > 0) return false;
  if (Connections::ofThisThread().canBeRead(localPort)) return true;
  const curl_tlssessioninfo* session = nullptr;
  library().easyGetinfo(handle_.get(), CURLINFO_TLS_SSL_PTR, &session);
  if (session == nullptr || session->internals == nullptr) return url_.scheme() == "https";
  if (session->backend == CURLSSLBACKEND_OPENSSL && library().openSSLHasPending != nullptr) {
    return library().openSSLHasPending(session->internals) != 0;
  }
  if (session->backend == CURLSSLBACKEND_GNUTLS && library().gnuTLSPending != nullptr) {
    return library().gnuTLSPending(session->internals) != 0;
  }
  return true;  // nobody knows
}

int NetworkTransfer::status() const {
  long status = 0;
  library().easyGetinfo(handle_.get(), CURLINFO_RESPONSE_CODE, &status);
  return static_cast<int>(status);
}

std::string NetworkTransfer::field(const char* name) const {
  if (!handle_) return "";
  curl_header* header = nullptr;
  library().easyHeader(handle_.get(), name, 0, CURLH_HEADER, -1, &header);
  return header != nullptr ? header->value : "";
}

bool NetworkTransfer::follow() {
  if (redirects_ == kMaximumRedirects) {
    error_ = transferError(CURLE_TOO_MANY_REDIRECTS, "Maximum (20) redirects followed");
    return false;
  }
  ++redirects_;
  std::optional<URL> target = url_.resolved(location_);
  if (!target) {
    error_ = transferError(CURLE_URL_MALFORMAT, "The redirect leads to no valid URL");
    return false;
  }
  if (!isSupported(*target, error_)) return false;
  target->adoptUserOf(firstURL_);
  url_ = std::move(*target);
  send(false);
  return true;
}

void NetworkTransfer::end(CURLcode result) {
  Connections::ofThisThread().remove(*this);
  if (std::exchange(refused_, false)) return send(true);
  if (std::exchange(isOtherPart_, false)) {
    request_.offset = 0;
    url_ = firstURL_;
    redirects_ = 0;
    return send(false);
  }
  // Where a redirect leads is known, however its page ended.
  const bool hasPage =
      result == CURLE_OK || result == CURLE_WRITE_ERROR || result == CURLE_PARTIAL_FILE;
  if (!error_ && !location_.empty() && hasPage && follow()) return;
  ended_ = true;
  if (error_) return;
  curl_off_t firstByteTime = 0;
  library().easyGetinfo(handle_.get(), CURLINFO_STARTTRANSFER_TIME_T, &firstByteTime);
  const bool isInHeader = firstByteTime > 0 && !begun_;
  // A failed status is the cause, however its page ended.
  const bool hasFailedStatus =
      !begun_ && (result == CURLE_OK || result == CURLE_WRITE_ERROR || status() >= 400);
  if (!begun_ && result == CURLE_OK && status() == 200) {
    error_ = transferError(CURLE_PARTIAL_FILE, "The header of the answer is cut short");
  } else if (hasFailedStatus) {
    error_ = {"HTTP", status(), "HTTP status " + std::to_string(status())};
  } else if (result == CURLE_OUT_OF_MEMORY && isInHeader) {
    // What the library says of a line beyond its limit.
    error_ = transferError(result, "A line of the answer's header is too long");
  } else if (result == CURLE_BAD_FUNCTION_ARGUMENT && isInHeader) {
    // What it says of one that is no field.
    error_ = transferError(result, "A line of the answer's header is malformed");
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
    if (status < 400) error_ = transferError(CURLE_WEIRD_SERVER_REPLY, framing_.fault());
    return false;
  }
  if (request_.offset > 0 && (status == 416 || (status == 206 && !isRest()))) {
    isOtherPart_ = true;
    return false;
  }
  if (status >= 300 && status < 400) location_ = trimmed(field("Location"));
  const bool isWantedPart = status == 206 && request_.offset > 0;
  if (status != 200 && !isWantedPart) return true;
  begun_ = true;
  if (!isWantedPart) request_.offset = 0;
  const std::optional<std::uint64_t> length = framing_.length();
  return sink_.begin(length ? static_cast<std::int64_t>(request_.offset + *length) : -1,
                     framing_.contentCodings(), error_);
}

bool NetworkTransfer::isRest() const {
  if (!framing_.length() || *framing_.length() == 0 || !framing_.contentCodings().empty()) {
    return false;
  }
  const std::uint64_t end = request_.offset + *framing_.length();
  constexpr std::uint64_t kLargest = std::numeric_limits<std::int64_t>::max();
  if (end > kLargest || lowercased(field("Content-Range")) !=
                            "bytes " + std::to_string(request_.offset) + "-" +
                                std::to_string(end - 1) + "/" + std::to_string(end)) {
    return false;
  }
  // Some servers send a part whatever the validator says.
  const std::string validator =
      field(request_.validator.starts_with('"') ? "ETag" : "Last-Modified");
  return validator.empty() || validator == request_.validator;
}

bool NetworkTransfer::didReceiveBody(std::string_view bytes) {
  if (begun_) return sink_.take(bytes, error_);
  ignoredSize_ += bytes.size();
  return !framing_.endsWithConnection() && ignoredSize_ <= kIgnoredBodyLimit;
}

bool NetworkTransfer::runAll(std::optional<std::chrono::milliseconds> limit) {
  return Connections::ofThisThread().run(limit);
}

}  // namespace platform
