#include "platform/net/GzipDecoder.h"

#include <climits>

#include "platform/text/Memory.h"

namespace platform {

GzipDecoder::~GzipDecoder() {
  if (state_ != State::kUnopened) inflateEnd(&stream_);
}

bool GzipDecoder::openMember() {
  constexpr int kGzipOnly = 16;
  stream_.zalloc = [](void*, uInt count, uInt size) {
    return Memory::allocate(std::size_t{count} * size);
  };
  stream_.zfree = [](void*, void* block) { Memory::release(block); };
  const int result = state_ == State::kUnopened ? inflateInit2(&stream_, MAX_WBITS + kGzipOnly)
                                                : inflateReset(&stream_);
  if (result == Z_OK) state_ = State::kInMember;
  return result == Z_OK;
}

bool GzipDecoder::decode(std::string_view bytes, const ByteSink& sink) {
  while (!bytes.empty()) {
    if (state_ != State::kInMember && !openMember()) return false;
    const std::string_view input = bytes.substr(0, UINT_MAX);
    // zlib takes its input without const unless told otherwise, and never writes to it.
    stream_.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(input.data()));
    stream_.avail_in = static_cast<uInt>(input.size());
    int result = Z_OK;
    do {
      stream_.next_out = reinterpret_cast<Bytef*>(output_.data());
      stream_.avail_out = static_cast<uInt>(output_.size());
      result = inflate(&stream_, Z_NO_FLUSH);
      const std::size_t size = output_.size() - stream_.avail_out;
      if (size > 0 && !sink({output_.data(), size})) return false;
    } while (result == Z_OK);
    // Z_BUF_ERROR only says that all input is used up.
    if (result != Z_STREAM_END && result != Z_BUF_ERROR) return false;
    if (result == Z_STREAM_END) state_ = State::kBetweenMembers;
    bytes.remove_prefix(input.size() - stream_.avail_in);
  }
  return true;
}

}  // namespace platform
