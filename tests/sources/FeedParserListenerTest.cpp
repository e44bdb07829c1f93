#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

#include "sources/FeedParser.h"

namespace {

using platform::Dictionary;

/// Notes what is taken, and where the end of it stood.
class Listener : public FeedParser {
 public:
  explicit Listener(std::string document) : FeedParser(std::move(document)) {}
  std::vector<std::string> taken;

 private:
  void take(Dictionary& target, const platform::Text& key,
            platform::PropertyListValue value) override {
    taken.push_back((isInItem() ? "item " : "channel ") + key.string() + " " +
                    value.asText().value_or(platform::Text()).string() + " at " +
                    position().text());
    FeedParser::take(target, key, std::move(value));
  }
};

TEST(FeedParserTest, ADerivedClassSeesWhatIsTaken) {
  Listener listener(std::string(
      "<rss><title>a</title>\n<image><title>b</title><url>c</url></image>\n"
      "<item><enclosure url=\"d\" length=\"0\" type=\"e\"/><guid>f</guid>\n"
      "<explicit>no</explicit><explicit>YES</explicit><pubDate>g</pubDate></item></rss>"));
  platform::ErrorSlot error;
  ASSERT_TRUE(listener.parseWithError(error));
  EXPECT_THAT(listener.taken,
              testing::ElementsAre(
                  "channel title a at line 1, column 14", "channel title b at line 2, column 16",
                  "channel poster c at line 2, column 30", "item url d at line 3, column 7",
                  "item contentType e at line 3, column 7",
                  "item advisoryLabel Explicit at line 4, column 37"));
  EXPECT_EQ(platform::textForKey(listener.feedAttributes(), "title"), "b");
}

}  // namespace
