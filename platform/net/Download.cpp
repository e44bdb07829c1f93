#include "platform/net/Download.h"

#include <cstddef>
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
  Transfer(Download& download, URL url, std::string destination, DownloadReceiver& receiver)
      : url_(std::move(url)),
        download_(download),
        destination_(std::move(destination)),
        receiver_(receiver) {}

  bool hasEvent() const override { return response_.has_value() || writtenLength_ > 0; }
  void deliverEvent() final;

 protected:
  /// Makes the next event, with nothing left to deliver. False once all bytes were written, or with
  /// an error when that failed.
  virtual bool advance(ErrorSlot& error) = 0;

  bool begin(std::int64_t expectedLength, const std::vector<std::string>& contentCodings,
             ErrorSlot& error) final {
    if (!decoder_.begin(contentCodings, ContentDecoder::UnknownNames::kRefused, error) ||
        !file_.create(destination_, error)) {
      return false;
    }
    response_ = decoder_.isCoded() ? -1 : expectedLength;
    return true;
  }

  bool take(std::string_view bytes, ErrorSlot& error) final {
    return decoder_.decode(
        bytes, [this, &error](std::string_view piece) { return write(piece, error); }, error);
  }

  URL url_;

 private:
  bool write(std::string_view bytes, ErrorSlot& error) {
    if (!file_.write(bytes, error)) return false;
    writtenLength_ += bytes.size();
    return true;
  }

  void finish(ErrorSlot error);

  Download& download_;
  std::string destination_;
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
  if (!error && decoder_.finish(error)) file_.commitReplacing(error);
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
  bool advance(ErrorSlot& error) override {
    error = network_.error();
    return false;
  }

  NetworkTransfer network_{url_, "identity", *this};
};

class Download::FileDownload final : public Transfer {
 public:
  using Transfer::Transfer;

  bool hasEvent() const override { return true; }

 private:
  bool advance(ErrorSlot& error) override {
    if (source_) return copyChunk(error);
    source_ = RegularFile::open(url_.path(), error);
    return source_ && begin(static_cast<std::int64_t>(source_->size()), {}, error);
  }

  bool copyChunk(ErrorSlot& error) {
    const std::optional<std::size_t> length = source_->read(buffer_, error);
    if (!length) return false;
    if (*length == 0) {
      if (copiedLength_ < source_->size()) {
        error = transferError(CURLE_PARTIAL_FILE, "The file became shorter while it was read");
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

Download::Download(const URL& url, const std::string& destination, DownloadReceiver& receiver) {
  if (url.scheme() == "file") {
    transfer_ = std::make_unique<FileDownload>(*this, url, destination, receiver);
  } else {
    transfer_ = std::make_unique<NetworkDownload>(*this, url, destination, receiver);
  }
}

Download::~Download() = default;

}  // namespace platform
