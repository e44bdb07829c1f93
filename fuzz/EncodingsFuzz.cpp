#include <algorithm>
#include <optional>
#include <string>

#include "fuzz/FuzzTarget.h"
#include "platform/net/GzipDecoder.h"
#include "platform/text/ASCII.h"
#include "platform/text/Base64.h"
#include "platform/text/TextEncoding.h"

namespace {

constexpr std::size_t kMostDecoded = std::size_t{1} << 20;

/// The whole stream's text, handed to the decoder in pieces; absent when it is refused or cut.
struct Decoding {
  std::optional<std::string> text;
  bool isTooLong = false;
};

Decoding decoded(std::string_view stream, std::size_t pieceSize) {
  platform::GzipDecoder decoder;
  std::string text;
  Decoding result;
  const auto take = [&](std::string_view bytes) {
    text += bytes;
    result.isTooLong = text.size() > kMostDecoded;
    return !result.isTooLong;
  };
  while (!stream.empty()) {
    if (!decoder.decode(stream.substr(0, pieceSize), take)) return result;
    stream.remove_prefix(std::min(pieceSize, stream.size()));
  }
  if (decoder.isWhole()) result.text = std::move(text);
  return result;
}

void decompress(std::string_view input) {
  if (input.empty()) return;
  const std::size_t pieceSize = 1 + static_cast<unsigned char>(input.front());
  input.remove_prefix(1);
  const Decoding whole = decoded(input, std::string_view::npos);
  const Decoding pieces = decoded(input, pieceSize);
  requireThat(whole.isTooLong == pieces.isTooLong && whole.text == pieces.text,
              "a stream is decompressed the same in whatever pieces it comes");
}

void requireBase64(std::string_view input) {
  const auto bytes = platform::bytesFromBase64(input);
  if (!bytes) return;
  const auto isDigit = [](char c) {
    return c != '=' && platform::kWhitespace.find(c) == std::string_view::npos;
  };
  const auto digits = static_cast<std::size_t>(std::ranges::count_if(input, isDigit));
  requireThat(bytes->size() == digits * 6 / 8, "each digit of base64 gives six bits");
}

/// The name of an encoding in the first line, a text in the rest.
void convert(std::string_view input) {
  const std::string_view encoding = input.substr(0, input.find('\n'));
  input.remove_prefix(std::min(encoding.size() + 1, input.size()));
  const auto text = platform::convertedToUTF8(input, encoding);
  requireThat(!text || platform::convertedToUTF8(*text, "UTF-8") == text,
              "what was converted is UTF-8");
  const auto name = platform::canonicalEncodingName(encoding);
  requireThat(!name || platform::canonicalEncodingName(*name) == name,
              "a canonical name is its own");
}

}  // namespace

/// The first byte chooses: the rest is a compressed stream behind the size of its pieces, base64,
/// or a text in some encoding.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view input = inputText(data, size);
  if (input.starts_with('g')) {
    decompress(input.substr(1));
  } else if (input.starts_with('b')) {
    requireBase64(input.substr(1));
  } else {
    convert(input.substr(std::min<std::size_t>(1, input.size())));
  }
  return 0;
}
