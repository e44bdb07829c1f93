#include "platform/net/MessageFraming.h"

#include <gtest/gtest.h>

#include <vector>

namespace platform {
namespace {

constexpr std::string_view kNoNumber = "The announced length is no number";
constexpr std::string_view kTooLarge = "The announced length cannot be true";
constexpr std::string_view kTwoLengths = "The announced lengths contradict each other";
constexpr std::string_view kUnknownCoding =
    "The body comes in a transfer coding that was not asked for";
constexpr std::string_view kBrokenField = "The header does not tell where the body ends";

MessageFraming framingOf(const std::vector<std::string_view>& lines) {
  MessageFraming framing;
  for (const std::string_view line : lines) framing.takeLine(line);
  return framing;
}

TEST(MessageFramingTest, TellsTheAnnouncedLength) {
  struct Row {
    std::vector<std::string_view> lines;
    std::optional<std::uint64_t> length;
  };
  const std::vector<Row> rows = {
      {{}, std::nullopt},
      {{"HTTP/1.1 200 OK\r\n", "\r\n"}, std::nullopt},
      {{"Content-Length: 5\r\n"}, 5},
      {{"content-length:5"}, 5},
      {{"CONTENT-LENGTH: \t 5 \t\r\n"}, 5},
      {{"Content-Length: 0\n"}, 0},
      {{"Content-Length: 0000000000000000000000005"}, 5},
      {{"Content-Length: 9223372036854775807"}, 9223372036854775807U},
      {{"Content-Length: 5", "Content-Length: 5"}, 5},
      {{"Content-Length: 5, 5 ,05"}, 5},
      {{"X-Content-Length: 7", "Content-Length: 5", "Content-Lengths: 8"}, 5},
      {{"Content-Length: 5", "Transfer-Encoding: chunked"}, std::nullopt},
      {{"Transfer-Encoding: chunked", "Content-Length: 5"}, std::nullopt},
      {{"Transfer-Encoding: Chunked , chunked"}, std::nullopt},
      {{"Transfer-Encoding: identity, ,"}, std::nullopt},
      {{"Transfer-Encoding: identity, chunked", "Content-Length: 5"}, std::nullopt},
      {{"Content-Length: x", "HTTP/1.1 200 OK", "Content-Length: 5"}, 5},
      {{"Transfer-Encoding: chunked", "http/1.1 200 OK", "Content-Length: 5"}, 5},
      {{"Content-Length: 5", "X-Folded: a", " b", "\r\n"}, 5},
  };
  for (std::size_t i = 0; i < rows.size(); ++i) {
    const MessageFraming framing = framingOf(rows[i].lines);
    EXPECT_EQ(framing.fault(), "") << "row " << i;
    EXPECT_EQ(framing.length(), rows[i].length) << "row " << i;
  }
}

TEST(MessageFramingTest, TellsTheContentCodings) {
  const struct {
    std::vector<std::string_view> lines;
    std::vector<std::string> codings;
  } rows[] = {
      {{}, {}},
      {{"Content-Encoding: gzip\r\n", "\r\n"}, {"gzip"}},
      {{"content-encoding:X-GZip , BR\r\n"}, {"x-gzip", "br"}},
      {{"Content-Encoding: identity, ,,Identity"}, {}},
      {{"Content-Encoding:"}, {}},
      {{"Content-Encoding: gzip", "Vary: *", "Content-Encoding: gzip"}, {"gzip", "gzip"}},
      {{"Content-Encoding: gzip,", "\tbr"}, {"gzip", "br"}},
      {{"Content-Encoding: br", "Vary: *", " gzip"}, {"br"}},
      {{"Content-Encoding: br", "HTTP/1.1 200 OK", "Content-Encoding: gzip"}, {"gzip"}},
  };
  for (const auto& row : rows) {
    const MessageFraming framing = framingOf(row.lines);
    EXPECT_EQ(framing.contentCodings(), row.codings);
    EXPECT_EQ(framing.fault(), "");
  }
}

TEST(MessageFramingTest, TellsWhetherTheConnectionEndsTheBody) {
  EXPECT_TRUE(framingOf({"Transfer-Encoding: identity"}).endsWithConnection());
  EXPECT_FALSE(framingOf({"Transfer-Encoding: chunked"}).endsWithConnection());
  EXPECT_FALSE(framingOf({"Content-Length: 0"}).endsWithConnection());
}

TEST(MessageFramingTest, FaultsAreNamed) {
  struct Row {
    std::vector<std::string_view> lines;
    std::string_view fault;
  };
  const std::vector<Row> rows = {
      {{"Content-Length:\r\n"}, kNoNumber},
      {{"Content-Length: -5"}, kNoNumber},
      {{"Content-Length: +5"}, kNoNumber},
      {{"Content-Length: 5x"}, kNoNumber},
      {{"Content-Length: 0x5"}, kNoNumber},
      {{"Content-Length: 5 5"}, kNoNumber},
      {{"Content-Length: 5.0"}, kNoNumber},
      {{"Content-Length: 5,"}, kNoNumber},
      {{"Content-Length: 99999999999999999999999x"}, kNoNumber},
      {{"Content-Length: 9223372036854775808"}, kTooLarge},
      {{"Content-Length: 99999999999999999999999"}, kTooLarge},
      {{"Content-Length: 5", "Content-Length: 6"}, kTwoLengths},
      {{"Content-Length: 6, 5"}, kTwoLengths},
      {{"Content-Length: 5", "Content-Length: 6", "Content-Length: 6"}, kTwoLengths},
      {{"Transfer-Encoding: gzip"}, kUnknownCoding},
      {{"Transfer-Encoding: gzip, chunked"}, kUnknownCoding},
      {{"Transfer-Encoding: chunked", "Transfer-Encoding: rot13"}, kUnknownCoding},
      {{"Transfer-Encoding: chunked;a=b"}, kUnknownCoding},
      {{"Transfer-Encoding: xchunked"}, kUnknownCoding},
      {{"Content-Length : 5"}, kBrokenField},
      {{"Transfer-Encoding\t: chunked"}, kBrokenField},
      {{"Content-Encoding : gzip"}, kBrokenField},
      {{"Transfer-Encoding: identity", "Content-Length: 5"}, kBrokenField},
      {{"Content-Length: 5", "Transfer-Encoding:"}, kBrokenField},
      {{"Content-Length"}, kBrokenField},
      {{"Content-Length: 5", " 6"}, kBrokenField},
      {{"Transfer-Encoding: chunked", "\tgzip"}, kBrokenField},
  };
  for (std::size_t i = 0; i < rows.size(); ++i) {
    EXPECT_EQ(framingOf(rows[i].lines).fault(), rows[i].fault) << "row " << i;
  }
}

}  // namespace
}  // namespace platform
