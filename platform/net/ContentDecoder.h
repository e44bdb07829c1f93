#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/net/GzipDecoder.h"
#include "platform/text/ByteSink.h"
#include "platform/text/ErrorRecord.h"

namespace platform {

/// Undoes the content coding of an answer's body that comes piece by piece: gzip, or none. All
/// failures fill the slot.
class ContentDecoder {
 public:
  /// What becomes of a body under a name that is no coding we know, such as "utf-8".
  enum class UnknownNames {
    kRefused,
    kIgnored,  // unless codings are known by that name that we cannot undo
  };

  /// Takes what MessageFraming tells, once and before the body. False for what cannot be undone,
  /// which is gzip twice, too.
  bool begin(const std::vector<std::string>& codings, UnknownNames unknown, ErrorSlot& error);
  /// Whether the body differs from what it is decoded to.
  bool isCoded() const { return gzip_.has_value(); }
  /// Hands on the next bytes, decoded. False once they are malformed, or the sink took no more, to
  /// whom the error is left then.
  bool decode(std::string_view bytes, const ByteSink& sink, ErrorSlot& error);
  /// Called behind the body: false when it was cut short.
  bool finish(ErrorSlot& error) const;

 private:
  std::optional<GzipDecoder> gzip_;
};

}  // namespace platform
