#include "platform/text/ByteSource.h"

namespace platform {

std::string_view ByteSource::head(ErrorSlot& error) {
  if (read_ && held_.empty()) {
    constexpr std::size_t kHeadSize = std::size_t{64} << 10;
    std::string first(kHeadSize, '\0');
    first.resize(read(first, error).value_or(0));
    held_ = std::move(first);
  }
  return held_;
}

std::optional<std::size_t> ByteSource::read(std::span<char> room, ErrorSlot& error) {
  std::size_t size = held_.copy(room.data(), room.size(), next_);
  next_ += size;
  if (next_ == held_.size()) {
    std::string().swap(held_);
    next_ = 0;
  }
  while (read_ && size < room.size()) {
    const std::optional<std::size_t> count = read_(room.subspan(size), error);
    if (!count) return std::nullopt;
    if (*count == 0) break;
    size += *count;
  }
  return size;
}

std::optional<std::string> ByteSource::readAll(ErrorSlot& error) {
  if (!read_) return std::exchange(held_, {});
  // The byte beyond lets the end be seen.
  std::string bytes(expectedSize_ + 1, '\0');
  std::size_t size = 0;
  while (const std::optional<std::size_t> count = read(std::span(bytes).subspan(size), error)) {
    size += *count;
    if (size < bytes.size()) {
      bytes.resize(size);
      return bytes;
    }
    bytes.resize(2 * size);
  }
  return std::nullopt;
}

}  // namespace platform
