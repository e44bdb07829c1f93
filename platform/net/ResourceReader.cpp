#include "platform/net/ResourceReader.h"

#include <algorithm>
#include <cstddef>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/net/ContentDecoder.h"
#include "platform/net/NetworkTransfer.h"
#include "platform/text/ASCII.h"
#include "platform/text/Case.h"

namespace platform {
namespace {

/// A few KiB can decompress to GiB. Feeds come near no such ratio; a small one may, by chance. What
/// is made of a body that keeps to it is counted by its parser.
constexpr std::uint64_t kLargestRatio = 50;
constexpr std::uint64_t kAnyRatioSize = std::uint64_t{1} << 20U;

/// The encoding that the field names (RFC 9110, section 8.3): of "text/xml; charset=\"koi8-r\""
/// that is koi8-r. Empty for none.
std::string charsetOf(std::string_view contentType) {
  std::vector<std::string> parameters(1);
  bool isQuoted = false;
  for (std::size_t i = 0; i < contentType.size(); ++i) {
    if (contentType[i] == '"') {
      isQuoted = !isQuoted;
    } else if (contentType[i] == ';' && !isQuoted) {
      parameters.emplace_back();
    } else {
      if (contentType[i] == '\\' && isQuoted && i + 1 < contentType.size()) ++i;
      parameters.back() += contentType[i];
    }
  }
  for (const std::string_view parameter : parameters) {
    const std::size_t nameLength = std::min(parameter.find('='), parameter.size());
    if (lowercased(trimmed(parameter.substr(0, nameLength))) != "charset") continue;
    return std::string(trimmed(parameter.substr(std::min(nameLength + 1, parameter.size()))));
  }
  return "";
}

/// Collects a body in memory, decompressed.
class BodyCollector : public NetworkTransfer::Sink {
 public:
  explicit BodyCollector(std::uint64_t limit) : limit_(limit) {}

  /// Servers name codings that are none ("utf-8"); what such a name stands for shows in the
  /// document.
  bool begin(std::int64_t expectedLength, const std::vector<std::string>& contentCodings,
             ErrorSlot& error) override {
    if (!decoder_.begin(contentCodings, ContentDecoder::UnknownNames::kIgnored, error)) {
      return false;
    }
    if (decoder_.isCoded() || expectedLength <= 0) return true;
    const auto length = static_cast<std::uint64_t>(expectedLength);
    if (length > limit_) return refuseAsTooLarge(error);
    // The announcement may be a lie; beyond this the body grows as its bytes come.
    constexpr std::uint64_t kLargestReservation = std::uint64_t{16} << 20U;
    body_.reserve(static_cast<std::size_t>(std::min(length, kLargestReservation)));
    return true;
  }

  bool take(std::string_view bytes, ErrorSlot& error) override {
    receivedSize_ += bytes.size();
    return decoder_.decode(
        bytes, [this, &error](std::string_view piece) { return append(piece, error); }, error);
  }

  /// The body once all bytes have come.
  std::optional<ByteSource> finish(ErrorSlot& error) {
    if (!decoder_.finish(error)) return std::nullopt;
    if (!decoder_.isCoded()) return ByteSource(std::move(body_));
    return ByteSource(std::move(body_), receivedSize_);
  }

 private:
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

  bool refuseAsTooLarge(ErrorSlot& error) const {
    error = transferError(CURLE_FILESIZE_EXCEEDED,
                          "The resource is larger than " + std::to_string(limit_) + " bytes");
    return false;
  }

  std::uint64_t limit_;
  std::uint64_t receivedSize_ = 0;  // as it was sent
  std::string body_;
  ContentDecoder decoder_;
};

}  // namespace

std::optional<ByteSource> readResource(const URL& url, ErrorSlot& error, std::uint64_t limit,
                                       int stallLimit) {
  if (url.scheme() == "file") return openWholeFile(url.path(), error);

  BodyCollector collector(limit);
  const NetworkTransfer transfer(url, {.acceptedEncoding = "gzip", .stallLimit = stallLimit},
                                 collector);
  while (!transfer.hasEnded()) NetworkTransfer::runAll();
  if (transfer.error()) {
    error = transfer.error();
    return std::nullopt;
  }
  std::optional<ByteSource> body = collector.finish(error);
  if (body) body->setEncodingHint(charsetOf(transfer.field("Content-Type")));
  return body;
}

}  // namespace platform
