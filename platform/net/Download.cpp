#include "platform/net/Download.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/files/RegularFile.h"
#include "platform/files/TemporaryFile.h"
#include "platform/net/ContentDecoder.h"
#include "platform/net/EventLoop.h"
#include "platform/net/NetworkTransfer.h"

namespace platform {

/// Gathers what happened to a download and hands it to the receiver, one event at a time.
class Download::Transfer : public EventSource, protected NetworkTransfer::Sink {
 public:
  Transfer(Download& download, URL url, FilePlace place, DownloadReceiver& receiver,
           DownloadOptions options)
      : url_(std::move(url)),
        download_(download),
        place_(std::move(place)),
        options_(std::move(options)),
        receiver_(receiver) {}

  bool hasEvent() const override { return response_.has_value() || writtenLength_ > 0; }
  void deliverEvent() final;

 protected:
  /// Makes the next event, with nothing left to deliver. False once all bytes were written, or with
  /// an error when that failed.
  virtual bool advance(ErrorSlot& error) = 0;

  /// What the file takes over from one that it is the copy of.
  virtual std::optional<FileAttributes> attributes() const { return std::nullopt; }

  bool begin(std::int64_t expectedLength, const std::vector<std::string>& contentCodings,
             ErrorSlot& error) override {
    if (!decoder_.begin(contentCodings, ContentDecoder::UnknownNames::kRefused, error)) {
      return false;
    }
    const bool isCreated =
        options_.partName.empty()
            ? file_.create(place_, error, attributes())
            : file_.createPart(place_, options_.partName, download_.resumedLength_, error);
    if (!isCreated) return false;
    response_ = decoder_.isCoded() ? -1 : expectedLength;
    return true;
  }

  bool take(std::string_view bytes, ErrorSlot& error) final {
    return decoder_.decode(
        bytes, [this, &error](std::string_view piece) { return write(piece, error); }, error);
  }

  URL url_;
  Download& download_;
  FilePlace place_;
  DownloadOptions options_;

 private:
  bool write(std::string_view bytes, ErrorSlot& error) {
    if (!file_.write(bytes, error)) return false;
    writtenLength_ += bytes.size();
    return true;
  }

  void finish(ErrorSlot error);

  DownloadReceiver& receiver_;
  ContentDecoder decoder_;
  TemporaryFile file_;
  std::optional<std::int64_t> response_;  // what is to be delivered
  std::uint64_t writtenLength_ = 0;
};

void Download::Transfer::deliverEvent() {
  ErrorSlot error;
  if (!Transfer::hasEvent() && !advance(error)) {
    finish(std::move(error));
  } else if (response_) {
    const std::int64_t expectedLength = *std::exchange(response_, std::nullopt);
    receiver_.didReceiveResponse(download_, expectedLength);
  } else {
    receiver_.didReceiveDataOfLength(download_, std::exchange(writtenLength_, 0));
  }
}

void Download::Transfer::finish(ErrorSlot error) {
  if (!error && decoder_.finish(error)) {
    options_.replaces ? file_.commitReplacing(error) : file_.commitNew(error);
  }
  // The transfer ends before its last event is told: the receiver may destroy the download, and the
  // event loop has nothing more to expect of it.
  Download& download = download_;
  DownloadReceiver& receiver = receiver_;
  download.transfer_.reset();
  if (error) {
    receiver.didFailWithError(download, *error);
  } else {
    receiver.downloadDidFinish(download);
  }
}

class Download::NetworkDownload final : public Transfer {
 public:
  using Transfer::Transfer;

  bool hasEvent() const override { return Transfer::hasEvent() || network_.hasEnded(); }

 private:
  bool begin(std::int64_t expectedLength, const std::vector<std::string>& contentCodings,
             ErrorSlot& error) override {
    download_.resumedLength_ = network_.offset();
    takeAnswer(contentCodings.empty());
    return Transfer::begin(expectedLength, contentCodings, error);
  }

  bool advance(ErrorSlot& error) override {
    error = network_.error();
    if (error && error->domain == "HTTP") takeAnswer(false);
    return false;
  }

  TransferRequest request() const {
    TransferRequest request{.acceptedEncoding = "identity", .stallLimit = options_.stallLimit};
    if (!options_.partValidator.empty() && place_.directory != nullptr) {
      request.offset = place_.directory->fileSize(options_.partName).value_or(0);
      request.validator = options_.partValidator;
    }
    return request;
  }

  void takeAnswer(bool isAsStored) {
    DownloadAnswer& answer = download_.answer_;
    answer.entityTag = network_.field("ETag");
    answer.lastModified = network_.field("Last-Modified");
    answer.contentType = network_.field("Content-Type");
    answer.retryAfter = network_.field("Retry-After");
    const std::string date = network_.field("Date");
    if (!isAsStored) return;
    if (answer.entityTag.starts_with('"')) {
      answer.validator = answer.entityTag;
    } else if (!date.empty() && answer.lastModified != date) {
      // A file of this second could still change in it.
      answer.validator = answer.lastModified;
    }
  }

  NetworkTransfer network_{url_, request(), *this};
};

class Download::FileDownload final : public Transfer {
 public:
  using Transfer::Transfer;

  bool hasEvent() const override { return true; }

 private:
  std::optional<FileAttributes> attributes() const override { return source_->attributes(); }

  bool advance(ErrorSlot& error) override {
    if (source_) return copyChunk(error);
    source_ = RegularFile::open(url_.path(), error);
    return source_ && begin(static_cast<std::int64_t>(source_->size()), {}, error);
  }

  bool copyChunk(ErrorSlot& error) {
    const std::optional<std::size_t> length = source_->read(buffer_, error);
    if (!length) return false;
    if (*length == 0) {
      if (copiedLength_ < source_->size() || source_->hasChanged()) {
        error = transferError(CURLE_PARTIAL_FILE, "The file changed while it was read");
      }
      return false;
    }
    copiedLength_ += *length;
    return take({buffer_.data(), *length}, error);
  }

  std::optional<RegularFile> source_;
  std::vector<char> buffer_ = std::vector<char>(std::size_t{256} << 10U);
  std::uint64_t copiedLength_ = 0;
};

Download::Download(const URL& url, const FilePlace& place, DownloadReceiver& receiver,
                   DownloadOptions options) {
  if (url.scheme() == "file") {
    transfer_ = std::make_unique<FileDownload>(*this, url, place, receiver, std::move(options));
  } else {
    transfer_ = std::make_unique<NetworkDownload>(*this, url, place, receiver, std::move(options));
  }
}

Download::~Download() = default;

bool isLostConnection(const ErrorRecord& error) {
  constexpr std::array<std::int64_t, 9> kCodes = {
      CURLE_COULDNT_RESOLVE_PROXY, CURLE_COULDNT_RESOLVE_HOST, CURLE_COULDNT_CONNECT,
      CURLE_PARTIAL_FILE,          CURLE_OPERATION_TIMEDOUT,   CURLE_SSL_CONNECT_ERROR,
      CURLE_GOT_NOTHING,           CURLE_SEND_ERROR,           CURLE_RECV_ERROR};
  return error.domain == "transfer" &&
         std::find(kCodes.begin(), kCodes.end(), error.code) != kCodes.end();
}

}  // namespace platform
