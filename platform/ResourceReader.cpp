#include "platform/ResourceReader.h"

#include <algorithm>
#include <cstddef>
#include <string_view>
#include <utility>

#include "platform/GzipDecoder.h"
#include "platform/NetworkTransfer.h"
#include "platform/TextHelpers.h"

namespace platform {
namespace {

/// Collects a body in memory, decompressed.
class BodyCollector : public NetworkTransfer::Sink {
 public:
  explicit BodyCollector(std::uint64_t limit) : limit_(limit) {}

  bool begin(std::int64_t expectedLength, std::string_view contentEncoding,
             ErrorSlot& error) override {
    const std::string encoding = lowercased(contentEncoding);
    if (encoding == "gzip" || encoding == "x-gzip") {
      decoder_.emplace();
      return true;
    }
    if (expectedLength <= 0) return true;
    const auto length = static_cast<std::uint64_t>(expectedLength);
    if (length > limit_) return failAsTooLarge(error);
    // The announcement may be a lie; beyond this the body grows as its bytes come.
    constexpr std::uint64_t kLargestReservation = std::uint64_t{16} << 20U;
    body_.reserve(static_cast<std::size_t>(std::min(length, kLargestReservation)));
    return true;
  }

  bool take(std::string_view bytes, ErrorSlot& error) override {
    if (!decoder_) return append(bytes, error);
    const auto sink = [this, &error](std::string_view piece) { return append(piece, error); };
    if (decoder_->decode(bytes, sink)) return true;
    if (!error) {
      error =
          transferError(TransferErrorCode::kBadContentEncoding, "The compressed body is malformed");
    }
    return false;
  }

  /// The body once all bytes have come.
  std::optional<std::string> finish(ErrorSlot& error) {
    if (decoder_ && !decoder_->isWhole()) {
      error =
          transferError(TransferErrorCode::kBadContentEncoding, "The compressed body is cut short");
      return std::nullopt;
    }
    return std::move(body_);
  }

 private:
  bool append(std::string_view bytes, ErrorSlot& error) {
    if (bytes.size() > limit_ - body_.size()) return failAsTooLarge(error);
    body_.append(bytes);
    return true;
  }

  bool failAsTooLarge(ErrorSlot& error) const {
    error = transferError(TransferErrorCode::kTooLarge,
                          "The resource is larger than " + std::to_string(limit_) + " bytes");
    return false;
  }

  std::uint64_t limit_;
  std::string body_;
  std::optional<GzipDecoder> decoder_;
};

}  // namespace

std::optional<std::string> readResource(const URL& url, ErrorSlot& error, std::uint64_t limit) {
  if (url.scheme() == "file") return readWholeFile(url.path(), error);

  BodyCollector collector(limit);
  const NetworkTransfer transfer(url, "gzip", collector);
  while (!transfer.hasEnded()) NetworkTransfer::runAll();
  if (transfer.error()) {
    error = transfer.error();
    return std::nullopt;
  }
  return collector.finish(error);
}

}  // namespace platform
