#include "platform/net/GzipDecoder.h"

#include <gtest/gtest.h>

#include <string>

#include "tests/support/GzipSamples.h"

namespace platform {
namespace {

/// What the stream decodes to when it comes in pieces of the size; "malformed" or "cut short".
std::string decoded(std::string_view stream, std::size_t pieceSize = 1 << 20) {
  GzipDecoder decoder;
  std::string output;
  const ByteSink sink = [&output](std::string_view bytes) {
    output += bytes;
    return true;
  };
  for (std::size_t i = 0; i < stream.size(); i += pieceSize) {
    if (!decoder.decode(stream.substr(i, pieceSize), sink)) return "malformed";
  }
  return decoder.isWhole() ? output : "cut short";
}

TEST(GzipDecoderTest, DecodesWhateverThePieces) {
  for (const std::size_t pieceSize : {1U, 2U, 7U, 37U, 38U, 1000U}) {
    EXPECT_EQ(decoded(kGzipStream, pieceSize), kGzipText) << pieceSize;
  }
}

TEST(GzipDecoderTest, DecodesSeveralMembers) {
  const std::string text(kGzipText);
  const std::string twice = std::string(kGzipStream) + std::string(kGzipStream);
  for (const std::size_t pieceSize : {1U, 38U, 39U, 1000U}) {
    EXPECT_EQ(decoded(twice, pieceSize), text + text) << pieceSize;
  }
}

TEST(GzipDecoderTest, HandsOutPiecesOfBoundedSize) {
  std::string stream;
  for (int i = 0; i < 16; ++i) stream += kGzipZeros;
  GzipDecoder decoder;
  std::size_t largest = 0;
  std::size_t total = 0;
  EXPECT_TRUE(decoder.decode(stream, [&](std::string_view bytes) {
    largest = std::max(largest, bytes.size());
    total += bytes.size();
    return true;
  }));
  EXPECT_TRUE(decoder.isWhole());
  EXPECT_EQ(total, 16U * 65536);
  EXPECT_LE(largest, 65536U);
}

TEST(GzipDecoderTest, EveryCutIsNoticed) {
  for (std::size_t length = 0; length < kGzipStream.size(); ++length) {
    EXPECT_EQ(decoded(kGzipStream.substr(0, length)), "cut short") << length;
  }
}

TEST(GzipDecoderTest, RefusesWhatIsMalformed) {
  std::string wrongChecksum(kGzipStream);
  wrongChecksum[wrongChecksum.size() - 5] ^= 1;
  std::string wrongLength(kGzipStream);
  wrongLength.back() ^= 1;
  EXPECT_EQ(decoded(wrongChecksum), "malformed");
  EXPECT_EQ(decoded(wrongLength), "malformed");
  EXPECT_EQ(decoded("<rss/>"), "malformed");
  EXPECT_EQ(decoded(std::string(kGzipStream) + "<rss/>"), "malformed");
}

TEST(GzipDecoderTest, StopsWhenTheSinkTakesNoMore) {
  GzipDecoder decoder;
  int calls = 0;
  EXPECT_FALSE(decoder.decode(kGzipStream, [&calls](std::string_view) {
    ++calls;
    return false;
  }));
  EXPECT_EQ(calls, 1);
}

}  // namespace
}  // namespace platform
