#include "companions/transfers/QELPart.h"

#include <algorithm>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <string_view>
#include <system_error>

#include "platform/files/FileManager.h"
#include "platform/files/Paths.h"
#include "platform/files/TemporaryFile.h"
#include "platform/text/ASCII.h"

namespace {

constexpr std::string_view kPrefix = ".qel-keep-";

/// FNV-1a. URLs with the same digest share a name; the note tells them apart.
std::string digest(std::string_view text) {
  std::uint64_t hash = 0xCBF29CE484222325;
  for (const char c : text) hash = (hash ^ static_cast<unsigned char>(c)) * 0x100000001B3;
  std::string digits;
  for (int shift = 60; shift >= 0; shift -= 4) digits += platform::kHexDigits[hash >> shift & 0xF];
  return digits;
}

/// The whole file; empty when it cannot be read.
std::string contentOf(const std::string& path) {
  platform::ErrorSlot error;
  auto bytes = platform::openWholeFile(path, error);
  return bytes ? bytes->readAll(error).value_or("") : "";
}

}  // namespace

QELPart::QELPart(const platform::Directory& directory, const std::string& path,
                 const std::string& url)
    : directory_(directory),
      path_(path),
      url_(url),
      name_(std::string(kPrefix) + digest(url) + ".part"),
      noteName_(std::string(kPrefix) + digest(url) + ".note") {}

/// Which start of the system this is, as Linux names it, and the URL.
std::string QELPart::noteBeginning() const {
  return contentOf("/proc/sys/kernel/random/boot_id") + url_ + "\n";
}

std::string QELPart::validator() const {
  const std::string note = contentOf(platform::joinedPath(path_, noteName_));
  const std::string beginning = noteBeginning();
  if (!note.starts_with(beginning) || !directory_.fileSize(name_).value_or(0)) return "";
  std::string validator = note.substr(beginning.size());
  // It becomes a line of a request.
  const bool isOneLine =
      std::all_of(validator.begin(), validator.end(), [](char c) { return c >= ' ' && c <= '~'; });
  return isOneLine ? validator : "";
}

void QELPart::note(const std::string& validator) const {
  platform::ErrorSlot ignored;  // without a note the next try begins anew
  if (validator.empty()) {
    directory_.remove(noteName_, ignored);
    return;
  }
  platform::TemporaryFile file;
  if (file.create({directory_, noteName_}, ignored) &&
      file.write(noteBeginning() + validator, ignored)) {
    file.commitReplacing(ignored);
  }
}

void QELPart::remove() const {
  platform::ErrorSlot ignored;
  directory_.remove(noteName_, ignored);
  directory_.remove(name_, ignored);
}

void QELPart::removeAll(const platform::Directory& directory, const std::string& path) {
  std::error_code ignored;
  platform::ErrorSlot dropped;
  for (const auto& entry : std::filesystem::directory_iterator(path, ignored)) {
    const std::string name = entry.path().filename().string();
    if (name.starts_with(kPrefix)) directory.remove(name, dropped);
  }
}
