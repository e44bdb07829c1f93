#pragma once

#include <string>
#include <string_view>

#include "platform/ErrorRecord.h"

namespace platform {

/// A file that is written under a hidden name in its destination's directory and gets its final
/// name in one step once it is whole.
///
/// Unless a commit succeeded, the destructor removes it; so do SIGINT and SIGTERM. A symbolic link
/// at the final name is replaced, never written through. Move-only is not needed: one scope owns
/// it.
class TemporaryFile {
 public:
  TemporaryFile() = default;
  ~TemporaryFile();
  TemporaryFile(const TemporaryFile&) = delete;
  TemporaryFile& operator=(const TemporaryFile&) = delete;

  /// Creates the hidden file beside `destination`, which may be 255 bytes long in its last
  /// component.
  bool create(const std::string& destination, ErrorSlot& error);
  /// Appends the bytes; a short write is a failure.
  bool write(std::string_view bytes, ErrorSlot& error);
  /// Closes the file, checks that, and moves it to the destination, replacing what is there (but
  /// never a directory).
  bool commitReplacing(ErrorSlot& error);
  /// The same, failing when anything exists at the destination.
  bool commitNew(ErrorSlot& error);

  /// The open file, -1 before `create` and after a commit.
  int descriptor() const { return descriptor_; }

 private:
  bool close(ErrorSlot& error);
  void discard();

  int descriptor_ = -1;
  std::string path_;  // of the hidden file; empty when there is none
  std::string destination_;
};

}  // namespace platform
