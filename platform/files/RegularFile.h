#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <utility>

#include "platform/files/FileAttributes.h"
#include "platform/files/FileDescriptor.h"
#include "platform/text/ErrorRecord.h"

namespace platform {

/// A regular file open for reading. Nothing else is ever opened or waited for: a directory, a
/// device, a FIFO and a socket fail at once, and so does what the kernel makes up (all below /proc
/// and /sys) and a read that would have to wait.
class RegularFile {
 public:
  /// Symbolic links are followed. No value, and the slot filled, on failure.
  static std::optional<RegularFile> open(const std::string& path, ErrorSlot& error);

  int descriptor() const { return descriptor_.get(); }
  /// The size when it was opened; some file systems in user space claim 0 and hold more.
  std::uint64_t size() const { return size_; }
  /// What a copy takes over, of the moment when it was opened.
  const FileAttributes& attributes() const { return attributes_; }
  /// Whether its size or its time is another than when it was opened.
  bool hasChanged() const;
  /// Reads the next bytes: their number, 0 at the end. No value, and the slot filled, on failure.
  std::optional<std::size_t> read(std::span<char> buffer, ErrorSlot& error);

 private:
  RegularFile(FileDescriptor descriptor, std::uint64_t size, const FileAttributes& attributes)
      : descriptor_(std::move(descriptor)), size_(size), attributes_(attributes) {}

  FileDescriptor descriptor_;
  std::uint64_t size_;
  FileAttributes attributes_;
};

}  // namespace platform
