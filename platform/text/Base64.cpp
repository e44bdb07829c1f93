#include "platform/text/Base64.h"

#include <array>
#include <cstddef>
#include <cstdint>

#include "platform/text/ASCII.h"

namespace platform {
namespace {

constexpr std::string_view kAlphabet =
    "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

constexpr std::uint8_t kForeign = 0xFF;
constexpr std::uint8_t kIgnored = 0xFE;

constexpr std::array<std::uint8_t, 256> kSextets = [] {
  std::array<std::uint8_t, 256> sextets{};
  sextets.fill(kForeign);
  for (const char c : kWhitespace) sextets[static_cast<unsigned char>(c)] = kIgnored;
  for (std::size_t i = 0; i < kAlphabet.size(); ++i) {
    sextets[static_cast<unsigned char>(kAlphabet[i])] = static_cast<std::uint8_t>(i);
  }
  return sextets;
}();

}  // namespace

std::optional<std::string> bytesFromBase64(std::string_view text) {
  std::string bytes;
  bytes.reserve(text.size() / 4 * 3);
  std::uint32_t bits = 0;
  std::size_t characters = 0;
  std::size_t padding = 0;
  for (const char c : text) {
    if (c == '=') {
      ++padding;
      continue;
    }
    const std::uint8_t sextet = kSextets[static_cast<unsigned char>(c)];
    if (sextet == kIgnored) continue;
    if (sextet == kForeign || padding > 0) return std::nullopt;
    bits = bits << 6 | sextet;
    ++characters;
    // Every character but the first of a group of four completes a byte.
    if (const std::size_t place = characters % 4; place != 1) {
      bytes += static_cast<char>(bits >> ((4 - place) % 4 * 2) & 0xFF);
    }
  }
  if (padding > 2 || (characters + padding) % 4 != 0) return std::nullopt;
  return bytes;
}

}  // namespace platform
