#include "platform/files/FileReplacement.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <optional>
#include <system_error>

#include "platform/files/Directory.h"
#include "platform/files/FileDescriptor.h"
#include "platform/files/PosixError.h"
#include "platform/files/StandardStreams.h"
#include "platform/files/TemporaryFile.h"

namespace platform {
namespace {

/// As many links on the way as Linux follows itself.
constexpr int kMostLinks = 40;

bool fail(int code, ErrorSlot& error) {
  error = posixError(code);
  return false;
}

bool namesDescriptor(std::string_view path) {
  return path.starts_with("/dev/fd/") || path.starts_with("/proc/") || path == "/dev/stderr";
}

std::string directoryOf(const std::string& path) {
  return path.substr(0, path.rfind('/') + 1);
}

/// Where the links at the end of the path lead, whether anything is there or not.
std::optional<std::string> linksResolved(std::string path, ErrorSlot& error) {
  for (int links = 0; links <= kMostLinks; ++links) {
    std::error_code failure;
    const std::filesystem::path target = std::filesystem::read_symlink(path, failure);
    if (failure) return path;  // no link, or nothing at all
    path = target.is_absolute() ? target.string() : directoryOf(path) + target.string();
  }
  error = posixError(ELOOP);
  return std::nullopt;
}

bool writeInPlace(const std::string& path, std::string_view bytes, ErrorSlot& error) {
  FileDescriptor file = FileDescriptor::open(path, O_WRONLY | O_TRUNC);
  if (!file.isOpen() || !writeAll(file.get(), bytes) || !file.close()) return fail(errno, error);
  return true;
}

}  // namespace

bool replaceFile(const std::string& path, std::string_view bytes, ErrorSlot& error) {
  if (path == "-" || path == kStandardOutputPath) {
    flushStandardOutput();
    return writeAll(STDOUT_FILENO, bytes) || fail(errno, error);
  }

  struct stat status {};
  const bool exists = path.find('\0') == std::string::npos && ::stat(path.c_str(), &status) == 0;
  if (namesDescriptor(path) || (exists && !S_ISREG(status.st_mode))) {
    return writeInPlace(path, bytes, error);
  }

  const std::optional<std::string> target = linksResolved(path, error);
  if (!target) return false;
  const std::string parent = directoryOf(*target);
  const std::string name = target->substr(parent.size());
  std::optional<Directory> directory = Directory::open(parent.empty() ? "." : parent, error);
  if (!directory) return false;
  removeStaleTemporaryFiles(*directory);
  TemporaryFile file;
  return file.create({*directory, name}, error, directory->attributesForSuccessor(name)) &&
         file.write(bytes, error) && file.sync(error) && file.commitReplacing(error) &&
         directory->sync(error);
}

}  // namespace platform
