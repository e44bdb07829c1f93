#include "platform/net/ResourceReader.h"

#include <algorithm>
#include <cstddef>
#include <initializer_list>
#include <string_view>
#include <utility>

#include "platform/net/GzipDecoder.h"
#include "platform/net/NetworkTransfer.h"
#include "platform/text/ASCII.h"
#include "platform/text/Case.h"
#include "platform/text/Splitting.h"

namespace platform {
namespace {

/// A few KiB can decompress to GiB. Feeds come near no such ratio; a small one may, by chance. What
/// is made of a body that keeps to it is counted by its parser.
constexpr std::uint64_t kLargestRatio = 50;
constexpr std::uint64_t kAnyRatioSize = std::uint64_t{1} << 20U;

bool isOneOf(std::string_view text, std::initializer_list<std::string_view> texts) {
  return std::find(texts.begin(), texts.end(), text) != texts.end();
}

/// Collects a body in memory, decompressed.
class BodyCollector : public NetworkTransfer::Sink {
 public:
  explicit BodyCollector(std::uint64_t limit) : limit_(limit) {}

  bool begin(std::int64_t expectedLength, std::string_view contentEncoding,
             ErrorSlot& error) override {
    if (!beginDecoding(lowercased(contentEncoding), error)) return false;
    if (decoder_ || expectedLength <= 0) return true;
    const auto length = static_cast<std::uint64_t>(expectedLength);
    if (length > limit_) return refuseAsTooLarge(error);
    // The announcement may be a lie; beyond this the body grows as its bytes come.
    constexpr std::uint64_t kLargestReservation = std::uint64_t{16} << 20U;
    body_.reserve(static_cast<std::size_t>(std::min(length, kLargestReservation)));
    return true;
  }

  bool take(std::string_view bytes, ErrorSlot& error) override {
    receivedSize_ += bytes.size();
    if (!decoder_) return append(bytes, error);
    const auto sink = [this, &error](std::string_view piece) { return append(piece, error); };
    if (decoder_->decode(bytes, sink)) return true;
    return !error && refuseCoding("The compressed body is malformed", error);
  }

  /// The body once all bytes have come.
  std::optional<ByteSource> finish(ErrorSlot& error) {
    if (!decoder_) return std::move(body_);
    if (decoder_->isWhole()) return ByteSource(std::move(body_), receivedSize_);
    refuseCoding("The compressed body is cut short", error);
    return std::nullopt;
  }

 private:
  /// Servers name codings that are none ("utf-8"), so only those that are known to need decoding
  /// are refused; what an unknown name stands for shows in the document.
  bool beginDecoding(const std::string& codings, ErrorSlot& error) {
    for (const std::string_view piece : splitAt(codings, ',')) {
      const std::string_view name = trimmed(piece);
      const bool isGzip = isOneOf(name, {"gzip", "x-gzip"});
      if ((isGzip && decoder_) ||
          isOneOf(name, {"br", "compress", "x-compress", "deflate", "zstd"})) {
        return refuseCoding("The body comes in a content coding that was not asked for", error);
      }
      if (isGzip) decoder_.emplace();
    }
    return true;
  }

  bool append(std::string_view bytes, ErrorSlot& error) {
    if (bytes.size() > limit_ - body_.size()) return refuseAsTooLarge(error);
    const std::uint64_t size = body_.size() + bytes.size();
    if (size > kAnyRatioSize && size / kLargestRatio > receivedSize_) {
      error = transferError(CURLE_FILESIZE_EXCEEDED,
                            "The body is more than 50 times as large as its compressed form");
      return false;
    }
    body_.append(bytes);
    return true;
  }

  static bool refuseCoding(std::string_view cause, ErrorSlot& error) {
    error = transferError(CURLE_BAD_CONTENT_ENCODING, cause);
    return false;
  }

  bool refuseAsTooLarge(ErrorSlot& error) const {
    error = transferError(CURLE_FILESIZE_EXCEEDED,
                          "The resource is larger than " + std::to_string(limit_) + " bytes");
    return false;
  }

  std::uint64_t limit_;
  std::uint64_t receivedSize_ = 0;  // as it was sent
  std::string body_;
  std::optional<GzipDecoder> decoder_;
};

}  // namespace

std::optional<ByteSource> readResource(const URL& url, ErrorSlot& error, std::uint64_t limit) {
  if (url.scheme() == "file") return openWholeFile(url.path(), error);

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
