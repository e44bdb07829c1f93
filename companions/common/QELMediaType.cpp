#include "companions/common/QELMediaType.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <utility>

#include "platform/text/Case.h"

namespace {

constexpr std::array<std::pair<std::string_view, std::string_view>, 33> kTypes = {{
    {"aac", "audio/aac"},       {"aif", "audio/aiff"},
    {"aiff", "audio/aiff"},     {"flac", "audio/flac"},
    {"m4a", "audio/mp4"},       {"m4b", "audio/mp4"},
    {"mka", "audio/matroska"},  {"mp3", "audio/mpeg"},
    {"oga", "audio/ogg"},       {"ogg", "audio/ogg"},
    {"opus", "audio/ogg"},      {"wav", "audio/wav"},
    {"weba", "audio/webm"},     {"wma", "audio/x-ms-wma"},
    {"avi", "video/x-msvideo"}, {"m4v", "video/mp4"},
    {"mkv", "video/matroska"},  {"mov", "video/quicktime"},
    {"mp4", "video/mp4"},       {"mpeg", "video/mpeg"},
    {"mpg", "video/mpeg"},      {"ogv", "video/ogg"},
    {"webm", "video/webm"},     {"wmv", "video/x-ms-wmv"},
    {"avif", "image/avif"},     {"gif", "image/gif"},
    {"jpeg", "image/jpeg"},     {"jpg", "image/jpeg"},
    {"png", "image/png"},       {"svg", "image/svg+xml"},
    {"webp", "image/webp"},     {"epub", "application/epub+zip"},
    {"pdf", "application/pdf"},
}};

}  // namespace

std::optional<std::string_view> QELMediaTypeOfExtension(std::string_view extension) {
  const std::string lowercased = platform::lowercased(extension);
  const auto* const found =
      std::find_if(kTypes.begin(), kTypes.end(),
                   [&lowercased](const auto& type) { return type.first == lowercased; });
  if (found == kTypes.end()) return std::nullopt;
  return found->second;
}

bool QELIsMediaType(std::string_view text) {
  const std::size_t slash = text.find('/');
  return slash != std::string_view::npos && slash != 0 && slash + 1 < text.size() &&
         text[slash + 1] != '/' && text.find_first_of(" \t\r\n") > slash + 1;
}
