#include <gtest/gtest.h>

#include <string>

#include "sources/FeedParser.h"

namespace {

TEST(FeedParserMemoryTest, RecordsOfACompressedFeedAreCounted) {
  const std::string amps = "<![CDATA[" + std::string(100'000, '&') + "]]>";
  const std::string quotes(100'000, '"');
  const struct {
    std::string part;
    int fits;
    int exceeds;
  } rows[] = {
      {"<item/>", 27'000, 29'000},
      {"<title/>", 27'000, 32'000},
      {"<item><title>" + amps + "</title></item>", 2, 4},
      {"<item><link>document/uuid/" + std::string(36, 'x') + "</link></item>", 10'000, 11'000},
      {"<item><explicit>yes</explicit></item>", 14'000, 15'500},
      {"<item><pubDate>1 Jan 2000 00:00 GMT</pubDate></item>", 12'500, 13'500},
      {"<item><enclosure url='" + quotes + "'/></item>", 2, 3},
      {"<item><enclosure type='" + quotes + "'/></item>", 2, 3},
      {"<item><enclosure length='1'/></item>", 14'000, 15'000},
      {"<orvane:image href='" + quotes + "'/>", 2, 3},
      {"<orvane:category text='" + quotes + "'/>", 2, 3},
      {"<image><url>" + amps + "</url></image>", 2, 4},
  };
  for (const auto& row : rows) {
    const auto outcome = [&row](int count) -> std::string {
      std::string document = "<rss>";
      for (int part = 0; part < count; ++part) document += row.part;
      const auto parser =
          FeedParser::parserWithFeedData(platform::ByteSource(document + "</rss>", 0));
      platform::ErrorSlot error;
      if (parser->parseWithError(error)) return "";
      return error->description.substr(0, error->description.find(" at line"));
    };
    EXPECT_EQ(outcome(row.fits), "") << row.part.substr(0, 30);
    EXPECT_EQ(outcome(row.exceeds), "a document out of all proportion to its compressed form")
        << row.part.substr(0, 30);
  }
}

}  // namespace
