#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "platform/files/Directory.h"
#include "platform/files/FileAttributes.h"
#include "platform/files/FileDescriptor.h"
#include "platform/text/ErrorRecord.h"

namespace platform {

/// A file that is written under a hidden name in its destination's directory and gets its final
/// name in one step once it is whole.
///
/// Unless a commit succeeded, the destructor removes it; so does any failure, and so does every
/// signal that would end the process, but for SIGKILL and those that tell of a fault of the process
/// itself (SIGSEGV, SIGABRT...). A symbolic link at the final name is replaced, never written
/// through. Move-only is not needed: one scope owns it.
///
///     TemporaryFile file;
///     return file.create("show/one.mp3", error) && file.write(bytes, error) &&
///            file.commitReplacing(error);
class TemporaryFile {
 public:
  TemporaryFile() = default;
  ~TemporaryFile();
  TemporaryFile(const TemporaryFile&) = delete;
  TemporaryFile& operator=(const TemporaryFile&) = delete;

  /// Creates the hidden file beside the place, whose name may be 255 bytes long. A file that this
  /// object had before is removed. The file is one that everyone may use, as far as the umask lets
  /// them; with attributes it is the owner's alone until a commit gives it those, where the file
  /// system has them.
  bool create(const FilePlace& place, ErrorSlot& error,
              const std::optional<FileAttributes>& attributes = std::nullopt);
  /// The same under a name of its own beside the place, for a file that is to outlive a failure:
  /// nothing but a commit and `create` changes that name. Of the file there, which must be a
  /// regular one, the first `keptSize` bytes stay, and it fails when there are fewer.
  bool createPart(const FilePlace& place, const std::string& partName, std::uint64_t keptSize,
                  ErrorSlot& error);
  /// Appends the bytes; a short write is a failure.
  bool write(std::string_view bytes, ErrorSlot& error);
  /// Returns once the content is on the disk.
  bool sync(ErrorSlot& error);
  /// Closes the file, checks that, and moves it to the destination, replacing what is there (but
  /// never a directory). What replaces something is on the disk before: after a power cut either of
  /// the two is there whole.
  bool commitReplacing(ErrorSlot& error);
  /// The same, failing when anything exists at the destination, be it a dangling symbolic link.
  bool commitNew(ErrorSlot& error);

  /// The open file, -1 before `create`, after a commit and after a failure.
  int descriptor() const { return descriptor_.get(); }

  /// Removes all that exist in this process and ends it, with nothing of it run any more: no
  /// destructors, no functions registered for its end. Asks for no memory, on any thread.
  [[noreturn]] static void removeAllAndExit(int status);

 private:
  class Registry;

  bool openDirectory(const FilePlace& place, ErrorSlot& error);
  bool createHidden(ErrorSlot& error);
  bool fail(int code, ErrorSlot& error);
  bool takeLock(const std::string& name);
  void applyAttributes();
  bool commit(bool (*move)(int directory, const char* from, const char* to), ErrorSlot& error);
  void discard();

  FileDescriptor descriptor_;
  FileDescriptor ownDirectory_;  // of a path
  int directory_ = -1;
  std::string hiddenName_;  // empty when there is none
  std::string name_;
  std::optional<FileAttributes> attributes_;
  bool needsLock_ = false;
  bool isPart_ = false;            // not in the registry
  TemporaryFile* next_ = nullptr;  // in the registry
};

/// Whether the name (without a directory) could be that of such a hidden file, whoever made it.
bool isTemporaryFileName(std::string_view name);

/// Removes from a directory the hidden files that a killed run left there. A file that a living
/// process still writes is not touched, nor is any other; failures are not reported. The directory
/// is locked where nobody else holds its lock, as it has to be: files in a directory that is locked
/// have no locks of their own.
void removeStaleTemporaryFiles(Directory& directory);

}  // namespace platform
