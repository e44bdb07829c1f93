#include "platform/files/FileManager.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstddef>
#include <filesystem>
#include <memory>
#include <span>
#include <string_view>
#include <system_error>
#include <utility>

#include "platform/files/FileDescriptor.h"
#include "platform/files/PosixError.h"
#include "platform/files/RegularFile.h"
#include "platform/files/TemporaryFile.h"

namespace platform {
namespace {

/// Lets the kernel copy as much as it will: the number of bytes. Whatever it refuses, or takes for
/// the end of the file without being there, is left to the caller, who learns the reason by going
/// on from here.
std::uint64_t copyInsideKernel(const RegularFile& source, const TemporaryFile& copy) {
  // Small enough that a signal ends a copy promptly.
  constexpr std::size_t kPieceSize = std::size_t{64} << 20U;
  std::uint64_t length = 0;
  ssize_t count = 0;
  do {
    count =
        ::copy_file_range(source.descriptor(), nullptr, copy.descriptor(), nullptr, kPieceSize, 0);
    if (count > 0) length += static_cast<std::uint64_t>(count);
  } while (count > 0 || (count < 0 && errno == EINTR));
  return length;
}

/// Fails (EIO) for a file that changed meanwhile: the copy could be of nothing that ever was.
bool copyAll(RegularFile& source, TemporaryFile& copy, ErrorSlot& error) {
  std::uint64_t length = copyInsideKernel(source, copy);
  std::array<char, std::size_t{16} << 10U> buffer;  // on the stack, which may be small
  for (;;) {
    const std::optional<std::size_t> count = source.read(buffer, error);
    if (!count) return false;
    if (*count == 0) break;
    if (!copy.write(std::string_view(buffer.data(), *count), error)) return false;
    length += *count;
  }
  if (length >= source.size() && !source.hasChanged()) return true;
  error = posixError(EIO, "The file changed while it was copied");
  return false;
}

bool isTaken(const FilePlace& place) {
  if (place.directory != nullptr) return place.directory->contains(place.name);
  struct stat status {};
  return ::lstat(place.name.c_str(), &status) == 0;
}

}  // namespace

bool fileExists(const std::string& path) {
  struct stat status {};
  return path.find('\0') == std::string::npos && ::stat(path.c_str(), &status) == 0;
}

std::optional<ByteSource> openWholeFile(const std::string& path, ErrorSlot& error) {
  std::optional<RegularFile> opened = RegularFile::open(path, error);
  if (!opened) return std::nullopt;
  const auto file = std::make_shared<RegularFile>(std::move(*opened));
  const auto tooLarge = [] { return posixError(EFBIG, "The file is larger than 2 GiB"); };
  if (file->size() > kWholeReadLimit) {
    error = tooLarge();
    return std::nullopt;
  }
  // The whole is read once and then kept by us: it need not stay in the system's cache as well.
  ::posix_fadvise(file->descriptor(), 0, 0, POSIX_FADV_NOREUSE);
  return ByteSource(
      static_cast<std::size_t>(file->size()),
      [file, tooLarge, size = std::uint64_t{0}](std::span<char> room, ErrorSlot& failure) mutable {
        std::optional<std::size_t> count = file->read(room, failure);
        size += count.value_or(0);
        if (size > kWholeReadLimit) {
          failure = tooLarge();
          count.reset();
        }
        return count;
      });
}

std::optional<std::vector<std::string>> filesBelow(const std::string& directory, ErrorSlot& error) {
  namespace fs = std::filesystem;
  std::vector<std::string> names;
  std::error_code failure;
  fs::recursive_directory_iterator entry(directory, failure);
  for (; !failure && entry != fs::recursive_directory_iterator(); entry.increment(failure)) {
    std::error_code ignored;
    const bool isDirectory = entry->is_directory(ignored) && !entry->is_symlink(ignored);
    const bool isHidden = entry->path().filename().native().starts_with('.');
    if (isHidden) entry.disable_recursion_pending();
    if (isHidden || !isDirectory) names.push_back(entry->path().lexically_relative(directory));
  }
  if (failure) {
    error = posixError(failure.value());
    return std::nullopt;
  }
  std::sort(names.begin(), names.end());
  return names;
}

bool liesBelow(const std::string& path, const std::string& directory) {
  std::error_code failure;
  const std::string found = std::filesystem::canonical(path, failure);
  if (failure) return true;
  const std::string above = std::filesystem::canonical(directory, failure);
  return failure || found == above || found.starts_with(above == "/" ? above : above + "/");
}

bool createDirectories(const std::string& path, ErrorSlot& error) {
  if (path.empty() || path.find('\0') != std::string::npos) {
    error = posixError(path.empty() ? ENOENT : EINVAL);
    return false;
  }
  std::size_t begin = path.find_first_not_of('/');
  while (begin != std::string::npos) {
    const std::size_t end = path.find('/', begin);
    const std::string prefix = path.substr(0, end);
    begin = path.find_first_not_of('/', end);
    // What exists is not tried, since a read-only file system may refuse before it looks; and
    // another process may have been quicker.
    std::error_code ignored;
    if (std::filesystem::is_directory(prefix, ignored)) continue;
    if (::mkdir(prefix.c_str(), 0777) == 0) continue;
    const int failure = errno;
    if (std::filesystem::is_directory(prefix, ignored)) continue;
    const bool isParent = begin != std::string::npos;
    error = posixError(failure == EEXIST && isParent ? ENOTDIR : failure);
    return false;
  }
  return true;
}

bool copyFile(const std::string& source, const FilePlace& place, ErrorSlot& error) {
  std::optional<RegularFile> original = RegularFile::open(source, error);
  if (!original) return false;
  if (isTaken(place)) {
    error = posixError(EEXIST);
    return false;
  }
  TemporaryFile copy;
  return copy.create(place, error, original->attributes()) && copyAll(*original, copy, error) &&
         copy.sync(error) && copy.commitNew(error);
}

bool copyFile(const std::string& source, const FilePlace& place) {
  ErrorSlot ignored;
  return copyFile(source, place, ignored);
}

}  // namespace platform
