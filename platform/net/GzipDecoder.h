#pragma once

#include <zlib.h>

#include <cstddef>
#include <string_view>
#include <vector>

#include "platform/text/ByteSink.h"

namespace platform {

/// Decompresses a gzip stream (RFC 1952, also of several members) that comes piece by piece.
class GzipDecoder {
 public:
  GzipDecoder() = default;
  ~GzipDecoder();
  GzipDecoder(const GzipDecoder&) = delete;
  GzipDecoder& operator=(const GzipDecoder&) = delete;

  /// Hands what the bytes decompress to, in pieces of bounded size, to the sink. False once the
  /// stream is malformed or the sink took no more.
  bool decode(std::string_view bytes, const ByteSink& sink);

  /// Whether the stream may end here: its checksum and length have come and were right.
  bool isWhole() const { return state_ == State::kBetweenMembers; }

 private:
  enum class State { kUnopened, kInMember, kBetweenMembers };

  bool openMember();

  z_stream stream_{};
  State state_ = State::kUnopened;
  std::vector<char> output_ = std::vector<char>(std::size_t{64} << 10U);
};

}  // namespace platform
