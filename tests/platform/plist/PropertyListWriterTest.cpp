#include "platform/plist/PropertyListWriter.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/plist/PropertyListReader.h"
#include "tests/support/PropertyListDump.h"

namespace platform {
namespace {

using namespace std::chrono_literals;
using namespace std::string_literals;

std::string written(const Dictionary& dictionary) {
  std::string output;
  EXPECT_TRUE(writePropertyList(dictionary, [&](std::string_view bytes) {
    output += bytes;
    return true;
  }));
  return output;
}

PropertyListValue readBack(std::string_view bytes) {
  ErrorSlot error;
  auto value = readPropertyList(std::string(bytes), error);
  EXPECT_TRUE(value) << error->description;
  return value ? std::move(*value) : PropertyListValue("nothing was read");
}

/// The value after it was written and read again; writing it once more must give the same bytes.
PropertyListValue carried(const PropertyListValue& value) {
  const std::string bytes = written({{"value", value}});
  const PropertyListValue root = readBack(bytes);
  const Dictionary* const dictionary = root.asDictionary();
  if (dictionary == nullptr || dictionary->size() != 1) return "no such dictionary was read";
  EXPECT_EQ(written(*dictionary), bytes);
  return dictionary->begin()->second;
}

/// The line that stands for the value, without its indentation.
std::string line(const PropertyListValue& value) {
  const std::string bytes = written({{"value", value}});
  constexpr std::string_view kBefore = "\t<key>value</key>\n\t";
  constexpr std::string_view kBehind = "\n</dict>\n</plist>\n";
  const std::size_t start = bytes.find(kBefore) + kBefore.size();
  EXPECT_TRUE(bytes.ends_with(kBehind));
  return bytes.substr(start, bytes.size() - kBehind.size() - start);
}

const std::string kProlog =
    "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
    "<!DOCTYPE plist PUBLIC \"-//Apple//DTD PLIST 1.0//EN\" "
    "\"http://www.apple.com/DTDs/PropertyList-1.0.dtd\">\n"
    "<plist version=\"1.0\">\n";

TEST(PropertyListWriterTest, WritesAnEmptyDictionary) {
  EXPECT_EQ(written({}), kProlog + "<dict/>\n</plist>\n");
}

TEST(PropertyListWriterTest, IndentsByTabsAndSortsKeys) {
  const Dictionary episode = {{"EpisodeOrder", std::int64_t{0}},
                              {"EpisodeName", "Tea & <cake>"},
                              {"EpisodeDate", PointInTime(1116246645s)}};
  const Dictionary podcast = {{"PodcastName", "Orbit"},
                              {"Episodes", PropertyListValue::Array{episode, Dictionary()}},
                              {"AllowedPosterTypes", PropertyListValue::Array()},
                              {"a<b", true}};
  EXPECT_EQ(written(podcast), kProlog +
                                  "<dict>\n"
                                  "\t<key>AllowedPosterTypes</key>\n"
                                  "\t<array/>\n"
                                  "\t<key>Episodes</key>\n"
                                  "\t<array>\n"
                                  "\t\t<dict>\n"
                                  "\t\t\t<key>EpisodeDate</key>\n"
                                  "\t\t\t<date>2005-05-16T12:30:45Z</date>\n"
                                  "\t\t\t<key>EpisodeName</key>\n"
                                  "\t\t\t<string>Tea &amp; &lt;cake&gt;</string>\n"
                                  "\t\t\t<key>EpisodeOrder</key>\n"
                                  "\t\t\t<integer>0</integer>\n"
                                  "\t\t</dict>\n"
                                  "\t\t<dict/>\n"
                                  "\t</array>\n"
                                  "\t<key>PodcastName</key>\n"
                                  "\t<string>Orbit</string>\n"
                                  "\t<key>a&lt;b</key>\n"
                                  "\t<true/>\n"
                                  "</dict>\n"
                                  "</plist>\n");
}

TEST(PropertyListWriterTest, WritesEveryKindOfValueSoThatItReadsBack) {
  struct Row {
    PropertyListValue value;
    const char* line;
  };
  using Data = PropertyListValue::Data;
  constexpr auto kInfinity = std::numeric_limits<double>::infinity();
  for (const Row& row : std::vector<Row>{
           {"", "<string></string>"},
           {"Pilot", "<string>Pilot</string>"},
           {std::int64_t{-5}, "<integer>-5</integer>"},
           {std::numeric_limits<std::int64_t>::min(), "<integer>-9223372036854775808</integer>"},
           {std::numeric_limits<std::int64_t>::max(), "<integer>9223372036854775807</integer>"},
           {std::numeric_limits<std::uint64_t>::max(), "<integer>18446744073709551615</integer>"},
           {0.1, "<real>0.1</real>"},
           {-0.0, "<real>-0</real>"},
           {3.0, "<real>3</real>"},
           {1e300, "<real>1e+300</real>"},
           {5e-324, "<real>5e-324</real>"},
           {std::numeric_limits<double>::max(), "<real>1.7976931348623157e+308</real>"},
           {kInfinity, "<real>+infinity</real>"},
           {-kInfinity, "<real>-infinity</real>"},
           {true, "<true/>"},
           {false, "<false/>"},
           {Data{""}, "<data></data>"},
           {Data{"\xFF"}, "<data>/w==</data>"},
           {Data{"\xFF\0"s}, "<data>/wA=</data>"},
           {Data{"\xFF\0\x01"s}, "<data>/wAB</data>"},
           {Data{"\xFF\0\x01>"s}, "<data>/wABPg==</data>"},
           {PropertyListValue::Array{}, "<array/>"},
           {Dictionary{}, "<dict/>"},
       }) {
    EXPECT_EQ(line(row.value), row.line);
    EXPECT_TRUE(carried(row.value) == row.value) << row.line;
  }
  const double noNumber = std::numeric_limits<double>::quiet_NaN();
  EXPECT_EQ(line(noNumber), "<real>nan</real>");
  EXPECT_EQ(dumped(carried(noNumber)), "nanr");
}

TEST(PropertyListWriterTest, WritesDatesOfAllTimesSoThatTheyReadBack) {
  struct Row {
    PointInTime date;
    const char* text;
    PointInTime readBack;
  };
  const auto at = [](std::int64_t seconds) { return PointInTime(std::chrono::seconds(seconds)); };
  for (const Row& row : std::vector<Row>{
           {at(0), "1970-01-01T00:00:00Z", at(0)},
           {at(0) + 999ms, "1970-01-01T00:00:00Z", at(0)},
           {at(0) - 1ms, "1969-12-31T23:59:59Z", at(-1)},
           {at(951782400), "2000-02-29T00:00:00Z", at(951782400)},
           {at(1136073599), "2005-12-31T23:59:59Z", at(1136073599)},
           {at(2147483648), "2038-01-19T03:14:08Z", at(2147483648)},
           {at(253402300799), "9999-12-31T23:59:59Z", at(253402300799)},
           {at(253402300800), "10000-01-01T00:00:00Z", at(253402300800)},
           {at(884541340800), "30000-01-01T00:00:00Z", at(884541340800)},
           {at(6311328232780800), "200000000-01-01T00:00:00Z", at(6311328232780800)},
           {at(-62135596800), "0001-01-01T00:00:00Z", at(-62135596800)},
           {at(-62167219200), "0000-01-01T00:00:00Z", at(-62167219200)},
           {at(-62167219201), "-0001-12-31T23:59:59Z", at(-62167219201)},
           {at(-63549360000), "-0044-03-15T00:00:00Z", at(-63549360000)},
           {PointInTime::max(), "292278994-08-17T07:12:55Z", at(9223372036854775)},
           // Its second begins before the first point in time.
           {PointInTime::min(), "-292275055-05-16T16:47:04Z", PointInTime::min()},
       }) {
    EXPECT_EQ(line(row.date), "<date>"s + row.text + "</date>");
    EXPECT_EQ(carried(row.date).asDate(), row.readBack) << row.text;
  }
}

TEST(PropertyListWriterTest, DatesReadBackOnEveryDayOfAnEra) {
  // 400 years and some, a prime number of seconds more than a day apart, around the year 0.
  Dictionary dates;
  for (std::int64_t i = 0; i < 150000; ++i)
    dates.emplace(std::to_string(1000000 + i),
                  PointInTime(std::chrono::seconds(-68500000000 + i * 86413)));
  EXPECT_TRUE(readBack(written(dates)) == PropertyListValue(dates));
}

TEST(PropertyListWriterTest, AnyTextReadsBackTheSame) {
  for (const std::string& text :
       std::vector<std::string>{"",
                                " ",
                                "\n",
                                "\t",
                                "\r",
                                "\r\n",
                                "\n\r\r\n\n",
                                " leading and trailing \t\n ",
                                "a\rb\r\nc\nd",
                                "<tag attribute=\"v\">&amp;</tag>",
                                "]]>",
                                "<![CDATA[x]]>",
                                "&#13;",
                                "\"'",
                                "caf\xC3\xA9",
                                "cafe\xCC\x81",
                                "\xD7\xA9\xD7\x9C\xD7\x95\xD7\x9D",
                                "\xE2\x80\xAE\xD8\xA7",
                                "\xF0\x9F\x8E\x99\xEF\xB8\x8F",
                                "\xF0\x9F\x91\xA9\xE2\x80\x8D\xF0\x9F\x9A\x80",
                                "\xEF\xBB\xBFmark",
                                "\xC2\x85\xE2\x80\xA8\xE2\x80\xA9",
                                "\x7F\xC2\x80\xC2\x9F",
                                "\xEE\x80\x80\xEF\xBF\xBD",
                                "\xF4\x8F\xBF\xBF",
                                "\xF0\x90\x80\x80"}) {
    EXPECT_EQ(carried(text).asText(), text);
    EXPECT_TRUE(readBack(written({{text, true}})) == PropertyListValue(Dictionary{{text, true}}))
        << text;
  }
}

TEST(PropertyListWriterTest, LeavesOutWhatXMLCannotHold) {
  struct Row {
    std::string text;
    const char* readBack;
  };
  for (const Row& row : std::vector<Row>{
           {"a\0b"s, "ab"},
           {"\x01\x02\x08\x0B\x0C\x0E\x1F!", "!"},
           {"a\xEF\xBF\xBE\xEF\xBF\xBF"
            "b",
            "ab"},
           {"a\xED\xA0\x80"
            "b",
            "ab"},
           {"a\xC3", "a"},
           {"\xFF", ""},
           {"\x1B", ""},
       })
    EXPECT_EQ(carried(row.text).asText(), row.readBack);
}

TEST(PropertyListWriterTest, WritesLongTextsInFewPieces) {
  std::string text;
  while (text.size() < 20'000'000) text += "A long tale of <tea> & caf\xC3\xA9.\r\n";
  const Dictionary dictionary = {{"text", text}, {"z", PropertyListValue::Data{text}}};
  std::string output;
  int pieces = 0;
  EXPECT_TRUE(writePropertyList(dictionary, [&](std::string_view bytes) {
    output += bytes;
    ++pieces;
    return true;
  }));
  EXPECT_LE(pieces, 64);
  EXPECT_TRUE(readBack(output) == PropertyListValue(dictionary));
}

TEST(PropertyListWriterTest, GathersSmallValuesIntoPieces) {
  const PropertyListValue::Array array(300000, PropertyListValue("0123456789"));
  std::size_t total = 0;
  std::vector<std::size_t> pieces;
  EXPECT_TRUE(writePropertyList({{"array", array}}, [&](std::string_view bytes) {
    pieces.push_back(bytes.size());
    total += bytes.size();
    return true;
  }));
  EXPECT_LE(pieces.size(), total / (1 << 20) + 1);
  EXPECT_LT(*std::max_element(pieces.begin(), pieces.end()), (1U << 20) + 100);
}

TEST(PropertyListWriterTest, StopsWhenTheSinkRefuses) {
  const PropertyListValue::Array array(300000, PropertyListValue("0123456789"));
  for (int accepted : {0, 1, 2}) {
    int calls = 0;
    EXPECT_FALSE(writePropertyList({{"array", array}},
                                   [&](std::string_view) { return calls++ < accepted; }));
    EXPECT_EQ(calls, accepted + 1);
  }
  EXPECT_FALSE(writePropertyList({}, [](std::string_view) { return false; }));
}

TEST(PropertyListWriterTest, WritesWhatIsNestedDeeperThanIsRead) {
  const auto nested = [](int depth) {
    PropertyListValue value = true;
    for (int i = 0; i < depth; ++i) {
      PropertyListValue::Array array;
      array.push_back(std::move(value));
      value = std::move(array);
    }
    return value;
  };
  // The root is the first level.
  EXPECT_TRUE(carried(nested(511)) == nested(511));
  const std::string bytes = written({{"value", nested(3000)}});
  EXPECT_NE(bytes.find("\n" + std::string(3001, '\t') + "<true/>\n"), std::string::npos);
}

}  // namespace
}  // namespace platform
