#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace platform {

/// A file descriptor that is closed by its owner's destruction. For the sources of this folder
/// only; failures are told by errno.
class FileDescriptor {
 public:
  FileDescriptor() = default;
  explicit FileDescriptor(int descriptor) : descriptor_(descriptor) {}
  ~FileDescriptor();
  FileDescriptor(FileDescriptor&& other) noexcept;
  FileDescriptor& operator=(FileDescriptor&& other) noexcept;
  FileDescriptor(const FileDescriptor&) = delete;
  FileDescriptor& operator=(const FileDescriptor&) = delete;

  /// open(2) with the flags given and those that every file of ours has. Not open after a failure;
  /// a path that holds a NUL is one (EINVAL).
  static FileDescriptor open(const std::string& path, int flags, unsigned mode = 0);

  bool isOpen() const { return descriptor_ >= 0; }
  /// The descriptor, -1 when not open.
  int get() const { return descriptor_; }
  /// A second descriptor of the same open file: its offset and its lock are shared.
  FileDescriptor duplicated() const;
  /// Closes it and tells whether all that was written got through. Not open afterwards in any case.
  bool close();

 private:
  int descriptor_ = -1;
};

/// Writes all bytes, however many calls that takes, and waits where the descriptor is non-blocking.
bool writeAll(int descriptor, std::string_view bytes);

/// Reads up to `capacity` bytes as soon as there are some: their number, 0 at the end, -1 on
/// failure, which includes a non-blocking descriptor that has none yet.
std::ptrdiff_t readSome(int descriptor, char* buffer, std::size_t capacity);

/// Appends all that is left of the input to `bytes`; `expectedSize` of it is a hint. 0 on success,
/// otherwise an errno value; EFBIG tells that `bytes` would exceed `limit`. After a failure `bytes`
/// holds what was read before it, at most `limit` bytes.
int readToEnd(int descriptor, std::uint64_t expectedSize, std::uint64_t limit, std::string& bytes);

/// Waits until the descriptor has input or has come to its end; false when that cannot be told.
bool waitForInput(int descriptor);

}  // namespace platform
