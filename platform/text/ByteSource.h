#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>

#include "platform/text/ErrorRecord.h"

namespace platform {

/// The bytes of a document for whoever reads them once: bytes in memory, which are given up when
/// they have been read, or those of a file, which are read straight to where they are wanted.
class ByteSource {
 public:
  /// Puts the next bytes into the room: how many, 0 at the end. No value, and the slot filled, on
  /// failure.
  using Read = std::function<std::optional<std::size_t>(std::span<char> room, ErrorSlot& error)>;

  /// Bytes that were received compressed name the size of what was received.
  ByteSource(std::string bytes, std::optional<std::uint64_t> compressedSize = std::nullopt)
      : expectedSize_(bytes.size()), compressedSize_(compressedSize), held_(std::move(bytes)) {}
  /// The size is what may be expected, and need not be true.
  ByteSource(std::size_t expectedSize, Read read)
      : expectedSize_(expectedSize), read_(std::move(read)) {}

  std::size_t expectedSize() const { return expectedSize_; }
  /// Absent for bytes that were not compressed.
  std::optional<std::uint64_t> compressedSize() const { return compressedSize_; }

  /// The name of the text encoding that came beside the bytes, for readers to whom the bytes tell
  /// none; empty when none came.
  const std::string& encodingHint() const { return encodingHint_; }
  void setEncodingHint(std::string name) { encodingHint_ = std::move(name); }

  /// The first bytes, which are still to be read: 64 KiB of a file, or all that is in memory.
  /// Called before anything is read. Empty only where there are none at all, and, with the slot
  /// filled, on failure.
  std::string_view head(ErrorSlot& error);

  /// Fills the room with the next bytes: how many, fewer than it takes at the end alone. No value,
  /// and the slot filled, on failure.
  std::optional<std::size_t> read(std::span<char> room, ErrorSlot& error);

  /// All bytes; called instead of reading. No value, and the slot filled, on failure.
  std::optional<std::string> readAll(ErrorSlot& error);

 private:
  std::size_t expectedSize_;
  std::string encodingHint_;
  std::optional<std::uint64_t> compressedSize_;
  std::string held_;      // of the bytes to be read, the first ones
  std::size_t next_ = 0;  // of these, the first that is still to be read
  Read read_;             // of the others; none for bytes in memory
};

}  // namespace platform
