#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <utility>

namespace platform {

/// A file descriptor that its owner's destruction closes. For the sources of this folder only: they
/// find the cause of a failure in errno, and report it to others by an ErrorSlot.
class FileDescriptor {
 public:
  FileDescriptor() = default;
  explicit FileDescriptor(int descriptor) : descriptor_(descriptor) {}
  ~FileDescriptor() { close(); }
  FileDescriptor(FileDescriptor&& other) noexcept
      : descriptor_(std::exchange(other.descriptor_, -1)) {}
  FileDescriptor& operator=(FileDescriptor other) noexcept {
    std::swap(descriptor_, other.descriptor_);
    return *this;
  }

  /// open(2) with the flags given and those that every file of ours has. Not open after a failure;
  /// a path that holds a NUL is one (EINVAL).
  static FileDescriptor open(const std::string& path, int flags, unsigned mode = 0);
  /// openat(2), likewise.
  static FileDescriptor openAt(int directory, const std::string& path, int flags,
                               unsigned mode = 0);

  bool isOpen() const { return descriptor_ >= 0; }
  /// The descriptor, -1 when not open.
  int get() const { return descriptor_; }
  /// False when what was written may not have got through. Not open afterwards in any case.
  bool close();
  /// Leaves the descriptor, open or not, to the caller.
  int release() { return std::exchange(descriptor_, -1); }

 private:
  int descriptor_ = -1;
};

/// Calls fsync, fdatasync or syncfs until no signal interrupts it. What has nothing to tell a disk
/// counts as told.
bool isSynced(int (*call)(int), int descriptor);

// These three wait where the descriptor is non-blocking, and go on after a signal.

/// Writes all bytes, however many calls that takes.
bool writeAll(int descriptor, std::string_view bytes);

/// Reads up to `capacity` bytes as soon as there are some: their number, 0 at the end, -1 on
/// failure.
std::ptrdiff_t readSome(int descriptor, char* buffer, std::size_t capacity);

/// Reads all that is left of the input, of which `expectedSize` is a guess. More than `limit` bytes
/// are a failure (EFBIG). After a failure `bytes` holds what was read before it, at most `limit`.
bool readToEnd(int descriptor, std::size_t expectedSize, std::size_t limit, std::string& bytes);

}  // namespace platform
