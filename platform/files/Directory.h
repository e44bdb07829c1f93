#pragma once

#include <compare>
#include <cstdint>
#include <optional>
#include <string>
#include <utility>

#include "platform/files/FileAttributes.h"
#include "platform/files/FileDescriptor.h"
#include "platform/text/ErrorRecord.h"

namespace platform {

/// Which file something is, whatever names it has; two files that exist at once never share it.
struct FileIdentity {
  std::uint64_t device;
  std::uint64_t number;
  // NOLINTNEXTLINE(modernize-use-nullptr): about what the compiler makes of it
  friend auto operator<=>(const FileIdentity&, const FileIdentity&) = default;
};

/// A directory that was opened once: files are made, looked at and renamed relative to it, so that
/// nothing that happens to its path meanwhile leads elsewhere.
///
/// A name is one component: never empty, "." or "..", without "/" and NUL. One that is none fails
/// (EINVAL), or names nothing. A directory that may be entered but not read will do; nothing in it
/// can be listed.
///
///     std::optional<Directory> bundle = Directory::open("show.podcast", error);
///     TemporaryFile file;
///     return bundle && file.create({*bundle, "one.mp3"}, error) && ...
class Directory {
 public:
  /// Open nowhere: whatever is made in it fails (EBADF), and it holds nothing.
  Directory() = default;

  /// Symbolic links are followed. No value, and the slot filled, on failure.
  static std::optional<Directory> open(const std::string& path, ErrorSlot& error);
  /// The directory of the name below this one, made first where it is missing. A link is followed
  /// to wherever it leads, as long as that is this directory or below it; it fails otherwise
  /// (EXDEV). Where everyone may make files and remove his own alone (/tmp), a link and a
  /// stranger's directory fail (EPERM). No value, and the slot filled, on failure.
  std::optional<Directory> openOrMake(const std::string& name, ErrorSlot& error) const;

  bool isOpen() const { return descriptor_.isOpen(); }
  /// Whether the path, links followed, leads to this directory now; not where it cannot be looked
  /// at.
  bool isAt(const std::string& path) const;
  /// For the sources of this folder; -1 when not open.
  int descriptor() const { return descriptor_.get(); }

  // What is under a name. Links are not followed.

  /// Whether anything is.
  bool contains(const std::string& name) const { return identity(name).has_value(); }
  bool containsLink(const std::string& name) const;
  /// Absent for what is missing or cannot be looked at.
  std::optional<FileIdentity> identity(const std::string& name) const;
  /// The size in bytes of a regular file; absent for anything else.
  std::optional<std::uint64_t> fileSize(const std::string& name) const;
  /// What the successor of a regular file takes over from it, its time not included: of one of this
  /// user its permissions; of a stranger's, which may have been put there on purpose, only that not
  /// everyone may read it, by being this user's alone. Absent for anything else.
  std::optional<FileAttributes> attributesForSuccessor(const std::string& name) const;

  /// Removes a file, or a link itself.
  bool remove(const std::string& name, ErrorSlot& error) const;

  enum class Wait { kForever, kNot };
  enum class Lock {
    kTaken,
    /// In a directory in which everyone may make files and remove his own alone (/tmp), where a
    /// stranger could hold the lock for ever; on a file system without locks; and in a directory
    /// that may not be read.
    kNotToBeHad,
    kHeldByAnother,
  };
  /// Takes the lock that all who fill the directory share: flock(2) on the directory itself. It is
  /// held until this object's destruction or the process's end.
  Lock lock(Wait wait);
  bool isLocked() const { return isLocked_; }

  // A file system that has nothing to tell a disk counts as one that has told it.

  /// Returns once the names in the directory are on the disk.
  bool sync(ErrorSlot& error) const;
  /// Returns once all that was written so far to the file system that the directory is on is on the
  /// disk. Fails as well when something of it was lost on the way since the directory was opened.
  bool syncFileSystem(ErrorSlot& error) const;
  bool isOnFileSystemOf(const Directory& other) const;

 private:
  Directory(FileDescriptor descriptor, bool isReadable)
      : descriptor_(std::move(descriptor)), isReadable_(isReadable) {}

  static std::optional<Directory> openAt(int parent, const std::string& path, ErrorSlot& error);
  bool isAtOrBelow(const Directory& other) const;
  bool synced(int (*call)(int), ErrorSlot& error) const;

  FileDescriptor descriptor_;
  bool isReadable_ = false;
  bool isLocked_ = false;
};

/// Whether the text can name something in a directory.
bool isFileName(const std::string& name);

/// Where a file is to stand: a path, or a name in an open directory, which must outlive the place
/// and whatever was made in it.
struct FilePlace {
  FilePlace(std::string path) : name(std::move(path)) {}
  FilePlace(const char* path) : name(path) {}
  FilePlace(const Directory& where, std::string nameThere)
      : directory(&where), name(std::move(nameThere)) {}

  const Directory* directory = nullptr;
  std::string name;  // the path, without a directory
};

}  // namespace platform
