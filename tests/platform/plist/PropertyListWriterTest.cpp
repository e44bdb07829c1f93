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
  std::optional<PropertyListFault> fault;
  auto value = readPropertyList(std::string(bytes), fault);
  EXPECT_TRUE(value) << fault->description;
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
                              {"a<b", ""}};
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
                                  "\t<string></string>\n"
                                  "</dict>\n"
                                  "</plist>\n");
}

TEST(PropertyListWriterTest, WritesEveryKindOfValueSoThatItReadsBack) {
  struct Row {
    PropertyListValue value;
    const char* line;
  };
  for (const Row& row : std::vector<Row>{
           {"", "<string></string>"},
           {"Pilot", "<string>Pilot</string>"},
           {std::int64_t{-5}, "<integer>-5</integer>"},
           {std::numeric_limits<std::int64_t>::min(), "<integer>-9223372036854775808</integer>"},
           {std::numeric_limits<std::int64_t>::max(), "<integer>9223372036854775807</integer>"},
           {std::numeric_limits<std::uint64_t>::max(), "<integer>18446744073709551615</integer>"},
           {PointInTime(1116246645s), "<date>2005-05-16T12:30:45Z</date>"},
           {PropertyListValue::Array{}, "<array/>"},
           {Dictionary{}, "<dict/>"},
       }) {
    EXPECT_EQ(line(row.value), row.line);
    EXPECT_TRUE(carried(row.value) == row.value) << row.line;
  }
}

TEST(PropertyListWriterTest, LeavesOutWhatNoPodcastHas) {
  using Array = PropertyListValue::Array;
  const PropertyListValue data = PropertyListValue::Data{"bytes"};
  EXPECT_EQ(written({{"a", 1.5}, {"b", true}, {"c", data}}), kProlog + "<dict/>\n</plist>\n");
  const Dictionary dictionary = {
      {"a", false}, {"b", Array{"x", 1.5, true, data, Array{data}}}, {"c", data}, {"d", "y"}};
  EXPECT_EQ(dumped(readBack(written(dictionary))), R"({"b": ["x", []], "d": "y"})");
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
    EXPECT_TRUE(readBack(written({{text, text}})) == PropertyListValue(Dictionary{{text, text}}))
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
  const Dictionary dictionary = {{"text", text}, {"z", text}};
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
    PropertyListValue value = "x";
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
  EXPECT_NE(bytes.find("\n" + std::string(3001, '\t') + "<string>x</string>\n"), std::string::npos);
}

}  // namespace
}  // namespace platform
