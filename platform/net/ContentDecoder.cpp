#include "platform/net/ContentDecoder.h"

#include <algorithm>
#include <initializer_list>

#include "platform/net/TransferLibrary.h"

namespace platform {
namespace {

bool isOneOf(std::string_view text, std::initializer_list<std::string_view> texts) {
  return std::find(texts.begin(), texts.end(), text) != texts.end();
}

bool refuse(std::string_view cause, ErrorSlot& error) {
  error = transferError(CURLE_BAD_CONTENT_ENCODING, cause);
  return false;
}

}  // namespace

bool ContentDecoder::begin(const std::vector<std::string>& codings, UnknownNames unknown,
                           ErrorSlot& error) {
  for (const std::string& name : codings) {
    const bool isGzip = isOneOf(name, {"gzip", "x-gzip"});
    if ((isGzip && gzip_) || isOneOf(name, {"br", "compress", "x-compress", "deflate", "zstd"}) ||
        (!isGzip && unknown == UnknownNames::kRefused)) {
      return refuse("The body comes in a content coding that was not asked for", error);
    }
    if (isGzip) gzip_.emplace();
  }
  return true;
}

bool ContentDecoder::decode(std::string_view bytes, const ByteSink& sink, ErrorSlot& error) {
  if (!gzip_) return sink(bytes);
  if (gzip_->decode(bytes, sink)) return true;
  return !error && refuse("The compressed body is malformed", error);
}

bool ContentDecoder::finish(ErrorSlot& error) const {
  return !gzip_ || gzip_->isWhole() || refuse("The compressed body is cut short", error);
}

}  // namespace platform
