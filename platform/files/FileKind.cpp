#include "platform/files/FileKind.h"

#include <algorithm>
#include <array>
#include <cstddef>

#include "platform/text/ASCII.h"
#include "platform/text/Case.h"

namespace platform {
namespace {

using namespace std::string_view_literals;

/// A kind by bytes at a place of the file, with its extensions between blanks.
struct Kind {
  std::string_view name;
  std::size_t offset;
  std::string_view bytes;
  std::string_view extensions;
};

constexpr auto kKinds = std::to_array<Kind>({
    {"an MP3 file", 0, "ID3", " mp3 mp2 aac flac "},  // the tag stands before others, too
    {"an MP4 file", 4, "ftyp", " mp4 m4a m4b m4v m4r mov aac 3gp heic avif "},
    {"an Ogg file", 0, "OggS", " ogg oga ogv opus spx "},
    {"a FLAC file", 0, "fLaC", " flac "},
    {"a WAVE file", 8, "WAVE", " wav wave "},
    {"an AIFF file", 0, "FORM", " aif aiff aifc "},
    {"a Matroska file", 0, "\x1A\x45\xDF\xA3", " webm mkv mka "},
    {"a JPEG picture", 0, "\xFF\xD8\xFF", " jpg jpeg jpe "},
    {"a PNG picture", 0, "\x89PNG", " png "},
    {"a GIF picture", 0, "GIF8", " gif "},
    {"a WebP picture", 8, "WEBP", " webp "},
    {"a PDF document", 0, "%PDF", " pdf "},
    {"a ZIP archive", 0, "PK\x03\x04", " zip epub docx pages key "},
    {kHTMLPage, 0, "", " html htm xhtml "},
    {"an AAC file", 0, "", " aac "},
    {"an MPEG audio file", 0, "", " mp3 mp2 mp1 mpga mpa "},
});

/// MPEG's audio begins with eleven bits that are set; two of the next tell the layer.
std::optional<std::string_view> kindOfAudioFrame(std::string_view head) {
  if (head.size() < 2 || head[0] != '\xFF') return std::nullopt;
  const auto second = static_cast<unsigned char>(head[1]);
  if ((second & 0xF6U) == 0xF0) return "an AAC file";
  const bool isMPEG = (second & 0xE0U) == 0xE0 && (second & 0x18U) != 0x08;
  if (isMPEG && (second & 0x06U) != 0) return "an MPEG audio file";
  return std::nullopt;
}

}  // namespace

std::optional<std::string_view> kindOfBytes(std::string_view head) {
  for (const Kind& kind : kKinds) {
    if (kind.bytes.empty() || kind.offset > head.size()) continue;
    if (head.substr(kind.offset).starts_with(kind.bytes)) return kind.name;
  }
  if (head.starts_with("\xEF\xBB\xBF")) head.remove_prefix(3);
  const std::string start = lowercased(trimmed(head).substr(0, 15));
  for (const std::string_view tag : {"<!doctype html"sv, "<html"sv, "<head"sv, "<body"sv}) {
    if (start.starts_with(tag)) return kHTMLPage;
  }
  return kindOfAudioFrame(head);
}

bool isExtensionOfKind(std::string_view extension, std::string_view kind) {
  const std::string wanted = lowercased(extension).insert(0, 1, ' ').append(1, ' ');
  const auto has = [&](const Kind& k) { return k.extensions.find(wanted) != std::string::npos; };
  const bool isOfKind = std::any_of(kKinds.begin(), kKinds.end(),
                                    [&](const Kind& k) { return k.name == kind && has(k); });
  return isOfKind || (kind != kHTMLPage && std::none_of(kKinds.begin(), kKinds.end(), has));
}

}  // namespace platform
