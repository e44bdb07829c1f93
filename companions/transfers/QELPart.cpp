#include "companions/transfers/QELPart.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <system_error>
#include <utility>

#include "platform/files/FileManager.h"
#include "platform/files/Paths.h"
#include "platform/files/TemporaryFile.h"
#include "platform/process/SystemStart.h"
#include "platform/text/ASCII.h"
#include "platform/text/Splitting.h"

namespace {

constexpr std::string_view kPrefix = ".qel-keep-";
constexpr std::size_t kNotedLines = 3;

/// FNV-1a. Files with the same digest share a name; the note tells them apart.
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

QELPart::QELPart(const platform::Directory& directory, std::string path, const std::string& url,
                 const std::string& titleAndUUID)
    : directory_(directory),
      path_(std::move(path)),
      file_(url + "\n" + titleAndUUID),
      name_(std::string(kPrefix) + digest(file_) + ".part"),
      noteName_(std::string(kPrefix) + digest(file_) + ".note") {}

/// Which start of the system this is, and what the part is of.
std::string QELPart::noteBeginning() const {
  return platform::systemStart().append("\n").append(file_).append("\n");
}

/// Validator, name and size as they were noted; empty when nothing of use was.
std::vector<std::string> QELPart::noted() const {
  const std::string note = contentOf(platform::joinedPath(path_, noteName_));
  const std::string beginning = noteBeginning();
  // Where the system tells no start of its own from another, nothing vouches for a part.
  if (!note.starts_with(beginning) || note.starts_with('\n')) return {};
  std::vector<std::string> lines;
  for (const std::string_view line :
       platform::splitAt(std::string_view(note).substr(beginning.size()), '\n')) {
    lines.emplace_back(line);
  }
  return lines.size() == kNotedLines ? lines : std::vector<std::string>();
}

std::string QELPart::validator() const {
  const std::vector<std::string> lines = noted();
  if (lines.empty() || directory_.fileSize(name_).value_or(0) == 0) return "";
  // It becomes a line of a request.
  const bool isOneLine =
      std::all_of(lines[0].begin(), lines[0].end(), [](char c) { return c >= ' ' && c <= '~'; });
  return isOneLine ? lines[0] : "";
}

std::optional<std::string> QELPart::finishedName() const {
  const std::vector<std::string> lines = noted();
  if (lines.empty() || directory_.contains(name_)) return std::nullopt;
  const std::uint64_t size = directory_.fileSize(lines[1]).value_or(0);
  const bool isWhole = size > 0 && (lines[2].empty() || lines[2] == std::to_string(size));
  return isWhole ? std::optional(lines[1]) : std::nullopt;
}

void QELPart::note(const std::string& validator, const std::string& fileName,
                   std::optional<std::uint64_t> size) const {
  platform::ErrorSlot ignored;  // without a note the next try begins anew
  platform::TemporaryFile file;
  const std::string sizeText = size ? std::to_string(*size) : "";
  if (file.create({directory_, noteName_}, ignored) &&
      file.write(noteBeginning() + validator + "\n" + fileName + "\n" + sizeText, ignored)) {
    file.commitReplacing(ignored);
  }
}

void QELPart::removeNote() const {
  platform::ErrorSlot ignored;
  directory_.remove(noteName_, ignored);
}

void QELPart::remove() const {
  removeNote();
  platform::ErrorSlot ignored;
  directory_.remove(name_, ignored);
}

void QELPart::removeAllBut(const std::set<std::string>& names, const platform::Directory& directory,
                           const std::string& path) {
  std::error_code ignored;
  platform::ErrorSlot dropped;
  for (const auto& entry : std::filesystem::directory_iterator(path, ignored)) {
    const std::string name = entry.path().filename().string();
    if (!name.starts_with(kPrefix)) continue;
    const std::string partName = std::string(platform::pathWithoutExtension(name)) + ".part";
    if (!names.contains(partName)) directory.remove(name, dropped);
  }
}
