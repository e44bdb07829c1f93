#include "platform/plist/PropertyListReader.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <limits>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "tests/support/BinaryPropertyList.h"
#include "tests/support/PropertyListDump.h"

namespace platform {
namespace {

using namespace std::string_literals;

/// The value as one line, or the error's domain, code and description.
std::string outcome(std::string_view bytes) {
  ErrorSlot error;
  const auto value = readPropertyList(std::string(bytes), error);
  EXPECT_NE(value.has_value(), error.has_value());
  if (value) return dumped(*value);
  if (!error) return "neither a value nor an error";
  return error->domain + " " + std::to_string(error->code) + ": " + error->description;
}

std::string repeated(std::string_view text, std::size_t count) {
  std::string result;
  for (std::size_t i = 0; i < count; ++i) result += text;
  return result;
}

struct Row {
  const char* name;
  std::string bytes;
  std::string expected;
};

void expectOutcomes(const std::vector<Row>& rows) {
  for (const Row& row : rows) EXPECT_EQ(outcome(row.bytes), row.expected) << row.name;
}

// --- The XML form

std::string document(std::string_view content) {
  return "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
         "<!DOCTYPE plist PUBLIC \"-//Apple//DTD PLIST 1.0//EN\" "
         "\"http://www.apple.com/DTDs/PropertyList-1.0.dtd\">\n"
         "<plist version=\"1.0\">\n" +
         std::string(content) + "\n</plist>\n";
}

TEST(PropertyListReaderTest, ReadsEveryKindOfXMLValue) {
  expectOutcomes({
      {"text", document("<string>Pilot</string>"), "\"Pilot\""},
      {"empty text", document("<string></string>"), "\"\""},
      {"empty text in one tag", document("<string/>"), "\"\""},
      {"text keeps white space", document("<string> \t\n a  b \n</string>"), "\" \t\n a  b \n\""},
      {"line breaks become line feeds", document("<string>a\r\nb\rc</string>"), "\"a\nb\nc\""},
      {"carriage return by reference", document("<string>a&#13;b&#xD;</string>"), "\"a\rb\r\""},
      {"references", document("<string>&lt;&amp;&gt;&quot;&apos;&#233;&#x1F399;</string>"),
       "\"<&>\"'\xC3\xA9\xF0\x9F\x8E\x99\""},
      {"CDATA", document("<string>a <![CDATA[<b> & ]]]]><![CDATA[>]]> c</string>"),
       "\"a <b> & ]]> c\""},
      {"comments and instructions vanish", document("<string>a<!-- - -->b<?c d?>e</string>"),
       "\"abe\""},
      {"integer", document("<integer>42</integer>"), "42"},
      {"negative integer", document("<integer>-42</integer>"), "-42"},
      {"integer with a plus", document("<integer>+42</integer>"), "42"},
      {"integer in white space", document("<integer>\n 42\t</integer>"), "42"},
      {"integer with leading zeros", document("<integer>007</integer>"), "7"},
      {"hexadecimal", document("<integer>0x1fF</integer>"), "511"},
      {"capital hexadecimal", document("<integer>0XA</integer>"), "10"},
      {"negative hexadecimal", document("<integer>-0x10</integer>"), "-16"},
      {"minus zero", document("<integer>-0</integer>"), "0"},
      {"largest signed", document("<integer>9223372036854775807</integer>"), "9223372036854775807"},
      {"smallest signed", document("<integer>-9223372036854775808</integer>"),
       "-9223372036854775808"},
      {"first unsigned", document("<integer>9223372036854775808</integer>"),
       "9223372036854775808u"},
      {"largest unsigned", document("<integer>18446744073709551615</integer>"),
       "18446744073709551615u"},
      {"real", document("<real>0.1</real>"), "0.1r"},
      {"real with exponent", document("<real>-1.5E+3</real>"), "-1500r"},
      {"real without point", document("<real>+3</real>"), "3r"},
      {"real no number", document("<real>nan</real>"), "nanr"},
      {"real infinities", document("<array><real>+infinity</real><real>-inf</real></array>"),
       "[infr, -infr]"},
      {"true", document("<true/>"), "true"},
      {"false with white space", document("<false> \n</false>"), "false"},
      {"data", document("<data>AAH/</data>"), "<0001ff>"},
      {"data in lines", document("<data>\n\tAA\n\t H/\r\n</data>"), "<0001ff>"},
      {"data with padding", document("<array><data>/w==</data><data>//8=</data></array>"),
       "[<ff>, <ffff>]"},
      {"empty data", document("<data/>"), "<>"},
      {"date", document("<date>2005-05-16T12:30:45Z</date>"), "2005-05-16T12:30:45.000"},
      {"empty array", document("<array/>"), "[]"},
      {"empty dictionary", document("<dict></dict>"), "{}"},
      {"nested",
       document("<dict><key>a</key><array><dict><key/><true/></dict>"
                "<string>x</string></array><key>b</key><dict/></dict>"),
       "{\"a\": [{\"\": true}, \"x\"], \"b\": {}}"},
      {"keys in any order", document("<dict><key>b</key><true/><key>a</key><false/></dict>"),
       "{\"a\": false, \"b\": true}"},
      {"the last of two keys counts",
       document("<dict><key>a</key><integer>1</integer><key>b</key><integer>2</integer>"
                "<key>a</key><integer>3</integer></dict>"),
       "{\"a\": 3, \"b\": 2}"},
      {"a key keeps white space", document("<dict><key> a&#13;\n</key><true/></dict>"),
       "{\" a\r\n\": true}"},
  });
}

TEST(PropertyListReaderTest, ReadsXMLInAnyDress) {
  const std::string plain = "<plist><string>caf\xC3\xA9</string></plist>";
  std::string wide = "\xFF\xFE";
  for (const char c : "<plist><string>caf\xE9</string></plist>"s) {
    wide += c;
    wide += '\0';
  }
  expectOutcomes({
      {"without declaration", plain, "\"caf\xC3\xA9\""},
      {"byte order mark", "\xEF\xBB\xBF" + plain, "\"caf\xC3\xA9\""},
      {"UTF-16", wide, "\"caf\xC3\xA9\""},
      {"Latin-1",
       "<?xml version='1.0' encoding='ISO-8859-1'?><plist><string>caf\xE9</string></plist>",
       "\"caf\xC3\xA9\""},
      {"white space first", "\n\t <?xml version='1.0'?>" + plain, "\"caf\xC3\xA9\""},
      {"attributes", "<plist version='9' a='b'><string c='d'>x</string></plist>", "\"x\""},
      {"internal entity",
       "<!DOCTYPE plist [<!ENTITY show 'Orbit'>]><plist><string>&show;!</string></plist>",
       "\"Orbit!\""},
      {"the DTD is not loaded",
       "<!DOCTYPE plist SYSTEM 'file:///nowhere/at/all.dtd'><plist><true/></plist>", "true"},
  });
}

TEST(PropertyListReaderTest, RefusesXMLThatIsNoPropertyList) {
  const auto list = [](std::string_view content) {
    return "<plist>" + std::string(content) + "</plist>";
  };
  expectOutcomes({
      {"empty", "", "PropertyList 1: an empty property list"},
      {"another document", "<rss/>",
       "PropertyList 1: a document whose root element is not \"plist\" at line 1, column 1"},
      {"a value without plist", "<dict/>",
       "PropertyList 1: a document whose root element is not \"plist\" at line 1, column 1"},
      {"prefixed plist", "<x:plist><true/></x:plist>",
       "PropertyList 1: a document whose root element is not \"plist\" at line 1, column 1"},
      {"no value", list(""), "PropertyList 1: a property list without a value at line 1, column 8"},
      {"two values", list("<true/><true/>"),
       "PropertyList 1: a second value in a property list at line 1, column 15"},
      {"value behind a container", list("<dict/><array/>"),
       "PropertyList 1: a second value in a property list at line 1, column 15"},
      {"plist in plist", list("<plist/>"),
       "PropertyList 1: an unexpected element \"plist\" at line 1, column 8"},
      {"unknown element", list("<dict><key>a</key><null/></dict>"),
       "PropertyList 1: an unexpected element \"null\" at line 1, column 26"},
      {"name in capitals", list("<String/>"),
       "PropertyList 1: an unexpected element \"String\" at line 1, column 8"},
      {"key at the root", list("<key>a</key>"),
       "PropertyList 1: a key outside of a dictionary at line 1, column 8"},
      {"key in an array", list("<array><key>a</key></array>"),
       "PropertyList 1: a key outside of a dictionary at line 1, column 15"},
      {"value without a key", list("<dict>\n\n  <key>a</key><true/>\n  <true/></dict>"),
       "PropertyList 1: a value without a key in a dictionary at line 4, column 3"},
      {"two keys", list("<dict><key>a</key>\n<key>b</key><true/></dict>"),
       "PropertyList 1: a key without a value in a dictionary at line 2, column 1"},
      {"key at the end", list("<dict><key>a</key>\n</dict>"),
       "PropertyList 1: a key without a value in a dictionary at line 2, column 1"},
      {"element in text", list("<string>a<string>b</string></string>"),
       "PropertyList 1: an element \"string\" inside of a value that holds text at line 1, "
       "column 17"},
      {"element in a key", list("<dict><key><true/></key></dict>"),
       "PropertyList 1: an element \"true\" inside of a value that holds text at line 1, "
       "column 19"},
      {"text in plist", list("a<true/>"),
       "PropertyList 1: text outside of a value that holds text at line 1, column 8"},
      {"text in an array", list("<array><true/> a</array>"),
       "PropertyList 1: text outside of a value that holds text at line 1, column 22"},
      {"text in a dictionary", list("<dict>&#160;</dict>"),
       "PropertyList 1: text outside of a value that holds text at line 1, column 14"},
      {"text in true", list("<true>yes</true>"),
       "PropertyList 1: text outside of a value that holds text at line 1, column 14"},
  });
}

TEST(PropertyListReaderTest, RefusesMalformedXMLWithTheParsersRecord) {
  for (const std::string_view bytes :
       {"   ", "x", "<plist>", "<plist><true></plist>", "<plist><true/></plist><plist/>",
        "<plist><string>&nbsp;</string></plist>", "<plist><string>\x01</string></plist>",
        "<plist><string>\xFF</string></plist>"}) {
    ErrorSlot error;
    EXPECT_FALSE(readPropertyList(std::string(bytes), error)) << bytes;
    ASSERT_TRUE(error) << bytes;
    EXPECT_EQ(error->domain, "XML") << bytes;
    EXPECT_NE(error->description.find(" at line 1, column "), std::string::npos)
        << error->description;
  }
}

TEST(PropertyListReaderTest, RefusesScalarsThatAreNone) {
  const auto expectRefused = [](std::string_view element, const std::vector<std::string>& contents,
                                const std::string& fault) {
    for (const std::string& content : contents) {
      const std::string start = "<plist><" + std::string(element) + ">" + content;
      EXPECT_EQ(
          outcome(start + "</" + std::string(element) + "></plist>"),
          "PropertyList 1: " + fault + " at line 1, column " + std::to_string(start.size() + 1))
          << element << " " << content;
    }
  };
  expectRefused("integer",
                {"", " ", "-", "+", "x", "4 2", "42a", "4.0", "1e3", "--1", "+-1", "0x", "0xG",
                 "0x-1", "- 1", "18446744073709551616", "-9223372036854775809",
                 "0x10000000000000000", "99999999999999999999999999"},
                "an integer that is none or out of range");
  expectRefused("real", {"", "x", "1,5", "0x1p3", "1.5x", "+-1", "++1", "1e999", "1 2"},
                "a real that is none or out of range");
  expectRefused(
      "data",
      {"A", "AA", "AAA", "AA=", "=", "====", "A===", "AA==AA==", "AA=A", "AA!=", "AAAA=", "AA==="},
      "data that is not in base64");
  expectRefused("date",
                {"",
                 "Z",
                 "2005-13-01T00:00:00Z",
                 "2005-00-01T00:00:00Z",
                 "2005-04-31T00:00:00Z",
                 "2005-02-29T00:00:00Z",
                 "1900-02-29T00:00:00Z",
                 "2005-01-00T00:00:00Z",
                 "2005-01-01T24:00:00Z",
                 "2005-01-01T00:60:00Z",
                 "2005-01-01T00:00:60Z",
                 "2005-01-01T00:00:00",
                 "2005-01-01T00:00:00z",
                 "2005-01-01 00:00:00Z",
                 "2005-01-01T00:00:00.5Z",
                 "2005-01-01T00:00:00+00:00",
                 "2005-01-01T00:00:00ZZ",
                 "2005-1-1T0:0:0Z",
                 "2005-01-01T-1:00:00Z",
                 "205-01-01T00:00:00Z",
                 "+2005-01-01T00:00:00Z",
                 "--2005-01-01T00:00:00Z",
                 "2005-01-01T",
                 "2005-01-01TZ",
                 "2005-Z",
                 "292278995-01-01T00:00:00Z",
                 "-292275056-01-01T00:00:00Z",
                 "999999999-01-01T00:00:00Z",
                 "99999999999999999999-01-01T00:00:00Z"},
                "a date that is none or out of range");
}

TEST(PropertyListReaderTest, ReadsDatesOfAllTimes) {
  struct DateRow {
    const char* text;
    std::int64_t seconds;
  };
  for (const DateRow& row : std::vector<DateRow>{
           {"1970-01-01T00:00:00Z", 0},
           {"1969-12-31T23:59:59Z", -1},
           {"2001-01-01T00:00:00Z", 978307200},
           {"2000-02-29T00:00:00Z", 951782400},
           {"2004-02-29T12:00:00Z", 1078056000},
           {"2005-12-31T23:59:59Z", 1136073599},
           {"2038-01-19T03:14:08Z", 2147483648},
           {"9999-12-31T23:59:59Z", 253402300799},
           {"10000-01-01T00:00:00Z", 253402300800},
           {"30000-01-01T00:00:00Z", 884541340800},
           {"0001-01-01T00:00:00Z", -62135596800},
           {"0000-01-01T00:00:00Z", -62167219200},
           {"0000-02-29T00:00:00Z", -62162121600},
           {"-0001-12-31T23:59:59Z", -62167219201},
           {"-0044-03-15T00:00:00Z", -63549360000},
           {"2005-05-16T12:30Z", 1116246600},
           {"2005-05-16T12Z", 1116244800},
           {"2005-05-16Z", 1116201600},
           {"2005-05Z", 1114905600},
           {"2005Z", 1104537600},
           {" \n2005Z\t", 1104537600},
       }) {
    ErrorSlot error;
    const auto value =
        readPropertyList("<plist><date>" + std::string(row.text) + "</date></plist>", error);
    ASSERT_TRUE(value) << row.text << ": " << error->description;
    ASSERT_TRUE(value->asDate()) << row.text;
    EXPECT_EQ(value->asDate()->time_since_epoch().count(), row.seconds * 1000) << row.text;
  }
}

TEST(PropertyListReaderTest, RefusesXMLCutAnywhere) {
  std::string whole = document(
      "<dict><key>Episodes</key><array><dict><key>EpisodeName</key><string>&lt;a&gt;</string>"
      "<key>EpisodeOrder</key><integer>1</integer><key>d</key><date>2005-05-16T12:30:45Z</date>"
      "<key>x</key><data>AAH/</data><key>t</key><true/></dict></array></dict>");
  whole.pop_back();  // the document ends before its last line break
  ASSERT_EQ(outcome(whole),
            "{\"Episodes\": [{\"EpisodeName\": \"<a>\", \"EpisodeOrder\": 1, \"d\": "
            "2005-05-16T12:30:45.000, \"t\": true, \"x\": <0001ff>}]}");
  for (std::size_t length = 0; length < whole.size(); ++length) {
    ErrorSlot error;
    EXPECT_FALSE(readPropertyList(whole.substr(0, length), error)) << length;
    EXPECT_TRUE(error) << length;
  }
}

TEST(PropertyListReaderTest, SurvivesXMLWithAnyBitFlipped) {
  const std::string whole =
      "<plist><dict><key>a</key><array><integer>12</integer><real>1.5</real><data>AAH/</data>"
      "<date>2005-05-16T12:30:45Z</date><true/><string>&lt;</string></array></dict></plist>";
  for (std::size_t i = 0; i < whole.size() * 8; ++i) {
    std::string flipped = whole;
    flipped[i / 8] = static_cast<char>(flipped[i / 8] ^ 1 << i % 8);
    outcome(flipped);  // expects either a value or an error
  }
}

TEST(PropertyListReaderTest, LimitsTheDepthOfXML) {
  const auto arrays = [](std::size_t depth) {
    return "<plist>" + repeated("<array>", depth) + repeated("</array>", depth) + "</plist>";
  };
  EXPECT_EQ(outcome(arrays(512)), repeated("[", 512) + repeated("]", 512));
  EXPECT_EQ(outcome(arrays(513)),
            "PropertyList 2: arrays and dictionaries nested deeper than 512 levels at line 1, "
            "column 3592");
  const auto dictionaries = [](std::size_t depth) {
    return "<plist>" + repeated("<dict><key>a</key>", depth) + "<true/>" +
           repeated("</dict>", depth) + "</plist>";
  };
  EXPECT_EQ(outcome(dictionaries(512)), repeated("{\"a\": ", 512) + "true" + repeated("}", 512));
  EXPECT_EQ(outcome(dictionaries(513)),
            "PropertyList 2: arrays and dictionaries nested deeper than 512 levels at line 1, "
            "column 9224");
  EXPECT_EQ(outcome("<plist>" + repeated("<array>", 1000000)),
            "PropertyList 2: arrays and dictionaries nested deeper than 512 levels at line 1, "
            "column 3592");
}

// --- The binary form

/// A list whose root is the one object.
std::string single(std::string object) {
  BinaryPropertyList list;
  return list.bytes(list.addBytes(std::move(object)));
}

/// The list with one of its trailer's fields, which is that many bytes before the end, changed.
std::string withTrailerField(std::string bytes, std::size_t fromEnd, std::string_view field) {
  return bytes.replace(bytes.size() - fromEnd, field.size(), field);
}

TEST(PropertyListReaderTest, ReadsEveryKindOfBinaryObject) {
  expectOutcomes({
      {"false", single("\x08"), "false"},
      {"true", single("\x09"), "true"},
      {"integer of 1 byte", single("\x10\xFF"), "255"},
      {"integer of 2 bytes", single("\x11\xFF\xFE"), "65534"},
      {"integer of 4 bytes", single("\x12\xFF\xFF\xFF\xFF"), "4294967295"},
      {"integer of 8 bytes", single("\x13\x01\x02\x03\x04\x05\x06\x07\x08"), "72623859790382856"},
      {"negative integer", single("\x13" + std::string(7, '\xFF') + "\xFB"), "-5"},
      {"unsigned integer", single("\x14" + std::string(8, '\0') + std::string(8, '\xFF')),
       "18446744073709551615u"},
      {"negative integer of 16 bytes", single("\x14" + std::string(16, '\xFF')), "-1"},
      {"real of 4 bytes", single("\x22\x3F\xC0\0\0"s), "1.5r"},
      {"real of 8 bytes", single("\x23\xC0\x04\0\0\0\0\0\0"s), "-2.5r"},
      {"date", single("\x33" + std::string(8, '\0')), "2001-01-01T00:00:00.000"},
      {"date with a fraction", single("\x33\x3F\xD0\0\0\0\0\0\0"s), "2001-01-01T00:00:00.250"},
      {"date before", single("\x33\xBF\xF0\0\0\0\0\0\0"s), "2000-12-31T23:59:59.000"},
      {"data", single("\x43\x00\x01\xFF"s), "<0001ff>"},
      {"empty data", single("\x40"), "<>"},
      {"text",
       single("\x53"
              "abc"),
       "\"abc\""},
      {"empty text", single("\x50"), "\"\""},
      {"long text", single("\x5F\x10\x10" + std::string(16, 'x')), "\"xxxxxxxxxxxxxxxx\""},
      {"count of 2 bytes", single("\x5F\x11\0\x02xy"s), "\"xy\""},
      {"count of 4 bytes", single("\x5F\x12\0\0\0\x02xy"s), "\"xy\""},
      {"bytes over 127 in ASCII",
       single("\x53"
              "a\xE9"
              "b"),
       "\"a\xEF\xBF\xBD"
       "b\""},
      {"UTF-16", single("\x65\x00\x61\x00\xE9\x20\xAC\xD8\x3C\xDF\x99"s),
       "\"a\xC3\xA9\xE2\x82\xAC\xF0\x9F\x8E\x99\""},
      {"lone surrogates", single("\x64\xD8\x3C\x00\x61\xDF\x99\xD8\x3C"s),
       "\"\xEF\xBF\xBD"
       "a\xEF\xBF\xBD\xEF\xBF\xBD\""},
      {"text that starts with a byte order mark", single("\x62\xFE\xFF\x00\x61"s),
       "\"\xEF\xBB\xBF"
       "a\""},
      {"UTF-8",
       single("\x73"
              "a\xC3\xA9"),
       "\"a\xC3\xA9\""},
      {"malformed UTF-8",
       single("\x72"
              "a\xC3"),
       "\"a\xEF\xBF\xBD\""},
      {"empty array", single("\xA0"), "[]"},
      {"empty set", single("\xC0"), "[]"},
      {"empty ordered set", single("\xB0"), "[]"},
      {"empty dictionary", single("\xD0"), "{}"},
  });
}

TEST(PropertyListReaderTest, ReadsBinaryContainers) {
  for (const std::size_t width : {1U, 2U, 3U, 8U}) {
    BinaryPropertyList list(width);
    const auto name = list.addText("EpisodeName");
    const auto order = list.addText("EpisodeOrder");
    const auto pilot = list.addText("Pilot");
    const auto one = list.addBytes("\x10\x01");
    const auto episode = list.addDictionary({order, name}, {one, pilot});
    const auto untitled = list.addDictionary({order}, {one});
    const auto episodes = list.addArray({episode, untitled, pilot});
    const auto key = list.addText("Episodes");
    const auto root = list.addDictionary({key}, {episodes});
    EXPECT_EQ(outcome(list.bytes(root)),
              "{\"Episodes\": [{\"EpisodeName\": \"Pilot\", \"EpisodeOrder\": 1}, "
              "{\"EpisodeOrder\": 1}, \"Pilot\"]}")
        << width;
  }
}

TEST(PropertyListReaderTest, TheLastOfTwoBinaryKeysCounts) {
  BinaryPropertyList list;
  const auto key = list.addText("a");
  const auto no = list.addBytes("\x08");
  const auto yes = list.addBytes("\x09");
  EXPECT_EQ(outcome(list.bytes(list.addDictionary({key, key}, {no, yes}))), "{\"a\": true}");
}

TEST(PropertyListReaderTest, BinaryListsShareTheirTexts) {
  BinaryPropertyList list;
  const auto text = list.addText(std::string(1000, 'x'));
  ErrorSlot error;
  const auto value =
      readPropertyList(list.bytes(list.addArray(std::vector<std::uint64_t>(200, text))), error);
  ASSERT_TRUE(value) << error->description;
  const auto& array = *value->asArray();
  ASSERT_EQ(array.size(), 200U);
  EXPECT_EQ(array.front().asText()->view().data(), array.back().asText()->view().data());
}

TEST(PropertyListReaderTest, RefusesMalformedBinaryObjects) {
  const std::string refused = "PropertyList 1: object 0 of a binary property list ";
  const std::string cut = refused + "is cut or of an unknown kind";
  const std::string count = refused + "has a malformed count";
  expectOutcomes({
      {"null", single("\0"s), cut},
      {"fill", single("\x0F"), cut},
      {"UID", single("\x80\x01"), cut},
      {"unused marker", single("\xE0"), cut},
      {"last marker", single("\xFF\x10\x00"s), cut},
      {"cut integer", single("\x13\x01"), cut},
      {"integer of 32 bytes", single("\x15" + std::string(32, '\0')), cut},
      {"positive integer beyond 64 bits",
       single("\x14" + std::string(7, '\0') + "\x01" + std::string(8, '\0')), cut},
      {"negative integer beyond 64 bits",
       single("\x14" + std::string(8, '\xFF') + std::string(8, '\0')), cut},
      {"cut real", single("\x23\x01"), cut},
      {"real of 2 bytes", single("\x21\x01\x01"), cut},
      {"real of 16 bytes", single("\x24" + std::string(16, '\0')), cut},
      {"cut date", single("\x33\x01"), cut},
      {"date of 4 bytes", single("\x32" + std::string(4, '\0')), cut},
      {"date that is no number", single("\x33\x7F\xF8\0\0\0\0\0\0"s), cut},
      {"infinite date", single("\x33\x7F\xF0\0\0\0\0\0\0"s), cut},
      {"date too far away", single("\x33\x43\x43\0\0\0\0\0\0"s), cut},
      {"date too long ago", single("\x33\xC3\x43\0\0\0\0\0\0"s), cut},
      {"cut data", single("\x42x"), cut},
      {"cut text", single("\x52x"), cut},
      {"cut UTF-16", single("\x62\0a\0"s), cut},
      {"text of 2^63 bytes", single("\x5F\x13\x80\0\0\0\0\0\0\0x"s), cut},
      {"UTF-16 of 2^63 units", single("\x6F\x13\x80\0\0\0\0\0\0\0x"s), cut},
      {"data of 2^64-1 bytes", single("\x4F\x13" + std::string(8, '\xFF')), cut},
      {"array of 2^63 elements", single("\xAF\x13\x80\0\0\0\0\0\0\0\0"s), refused + "is cut"},
      {"dictionary of 2^63 entries", single("\xDF\x13\x80\0\0\0\0\0\0\0\0"s), refused + "is cut"},
      {"dictionary without the values", single("\xD1\0"s), refused + "is cut"},
      {"missing count", single("\x5F"), count},
      {"cut count", single("\x5F\x11\x01"), count},
      {"count that is no integer", single("\x5F\x22\0\0\0\0"s), count},
      {"count of 16 bytes", single("\x5F\x14" + std::string(16, '\0')), count},
  });
}

TEST(PropertyListReaderTest, RefusesMalformedBinaryFrames) {
  const std::string list = single("\x09");
  const std::string trailer = "PropertyList 1: a binary property list with a malformed trailer";
  const std::string cut = "PropertyList 1: a cut binary property list";
  const std::string version = "PropertyList 1: a binary property list of an unknown version";
  const std::string zero(8, '\0');
  const std::string huge(8, '\xFF');
  ASSERT_EQ(outcome(list), "true");
  expectOutcomes({
      {"the mark alone", "bplist", version},
      {"another version", "bplist15" + list.substr(8), version},
      {"the header alone", "bplist00", cut},
      {"header and trailer overlap", "bplist00" + std::string(31, '\0'), cut},
      {"trailer of zeros", "bplist00" + std::string(32, '\0'), trailer},
      {"offsets of no bytes", withTrailerField(list, 26, "\0"s), trailer},
      {"offsets of 9 bytes", withTrailerField(list, 26, "\x09"), trailer},
      {"offsets of 255 bytes", withTrailerField(list, 26, "\xFF"), trailer},
      {"references of no bytes", withTrailerField(list, 25, "\0"s), trailer},
      {"references of 255 bytes", withTrailerField(list, 25, "\xFF"), trailer},
      {"no objects", withTrailerField(list, 24, zero),
       "PropertyList 1: object 0 of a binary property list does not exist"},
      {"too many objects", withTrailerField(list, 24, bigEndian(2, 8)), trailer},
      {"2^62 objects", withTrailerField(list, 24, bigEndian(std::uint64_t{1} << 62, 8)), trailer},
      {"2^64-1 objects", withTrailerField(list, 24, huge), trailer},
      {"root that does not exist", withTrailerField(list, 16, bigEndian(1, 8)),
       "PropertyList 1: object 1 of a binary property list does not exist"},
      {"root of 2^64-1", withTrailerField(list, 16, huge),
       "PropertyList 1: object 18446744073709551615 of a binary property list does not exist"},
      {"table in the header", withTrailerField(list, 8, bigEndian(7, 8)), trailer},
      {"table in the trailer", withTrailerField(list, 8, bigEndian(14, 8)), trailer},
      {"table at 2^64-1", withTrailerField(list, 8, huge), trailer},
      {"object in the header", std::string(list).replace(9, 4, bigEndian(7, 4)),
       "PropertyList 1: object 0 of a binary property list lies outside the objects"},
      {"object in the table", std::string(list).replace(9, 4, bigEndian(9, 4)),
       "PropertyList 1: object 0 of a binary property list lies outside the objects"},
      {"object at 2^32-1", std::string(list).replace(9, 4, huge.substr(0, 4)),
       "PropertyList 1: object 0 of a binary property list lies outside the objects"},
  });
}

TEST(PropertyListReaderTest, RefusesBinaryContainersWithBadReferences) {
  BinaryPropertyList stray;
  EXPECT_EQ(outcome(stray.bytes(stray.addArray({7}))),
            "PropertyList 1: object 7 of a binary property list does not exist");

  BinaryPropertyList numberAsKey;
  const auto number = numberAsKey.addBytes("\x10\x01");
  EXPECT_EQ(outcome(numberAsKey.bytes(numberAsKey.addDictionary({number}, {number}))),
            "PropertyList 1: object 0 of a binary property list is a key but no text");

  BinaryPropertyList self;
  EXPECT_EQ(outcome(self.bytes(self.addArray({0}))),
            "PropertyList 1: object 0 of a binary property list contains itself");

  BinaryPropertyList selfByValue;
  const auto key = selfByValue.addText("a");
  EXPECT_EQ(outcome(selfByValue.bytes(selfByValue.addDictionary({key}, {1}))),
            "PropertyList 1: object 1 of a binary property list contains itself");

  BinaryPropertyList cycle;
  cycle.addArray({1});
  cycle.addArray({2});
  cycle.addArray({0});
  EXPECT_EQ(outcome(cycle.bytes(1)),
            "PropertyList 1: object 1 of a binary property list contains itself");
}

std::string nestedBinaryArrays(std::size_t depth) {
  BinaryPropertyList list(4);
  std::uint64_t inner = list.addBytes("\x09");
  for (std::size_t i = 0; i < depth; ++i) inner = list.addArray({inner});
  return list.bytes(inner);
}

TEST(PropertyListReaderTest, LimitsTheDepthOfBinaryLists) {
  const std::string tooDeep =
      "PropertyList 2: arrays and dictionaries nested deeper than 512 levels";
  EXPECT_EQ(outcome(nestedBinaryArrays(512)), repeated("[", 512) + "true" + repeated("]", 512));
  EXPECT_EQ(outcome(nestedBinaryArrays(513)), tooDeep);
  EXPECT_EQ(outcome(nestedBinaryArrays(200000)), tooDeep);
}

TEST(PropertyListReaderTest, AcceptsSharedContainersInModeration) {
  BinaryPropertyList list;
  const auto pair = list.addArray({list.addBytes("\x08"), list.addBytes("\x09")});
  EXPECT_EQ(outcome(list.bytes(list.addArray({pair, pair, pair}))),
            "[[false, true], [false, true], [false, true]]");
}

TEST(PropertyListReaderTest, RefusesSharedObjectsThatExplode) {
  const std::string tooLarge =
      "PropertyList 2: a binary property list whose shared objects make it too large";

  BinaryPropertyList arrays;
  std::uint64_t inner = arrays.addText("ha");
  for (int level = 0; level < 40; ++level) inner = arrays.addArray({inner, inner});
  EXPECT_EQ(outcome(arrays.bytes(inner)), tooLarge);

  BinaryPropertyList dictionaries;
  const auto a = dictionaries.addText("a");
  const auto b = dictionaries.addText("b");
  inner = a;
  for (int level = 0; level < 40; ++level)
    inner = dictionaries.addDictionary({a, b}, {inner, inner});
  EXPECT_EQ(outcome(dictionaries.bytes(inner)), tooLarge);

  BinaryPropertyList data(2);
  const std::string block(1 << 16, 'x');
  inner = data.addBytes("\x4F\x12" + bigEndian(block.size(), 4) + block);
  EXPECT_EQ(outcome(data.bytes(data.addArray(std::vector<std::uint64_t>(10000, inner)))), tooLarge);

  BinaryPropertyList keys(2);
  const auto longKey = keys.addText(block);
  const auto entry = keys.addDictionary({longKey}, {longKey});
  EXPECT_EQ(outcome(keys.bytes(keys.addArray(std::vector<std::uint64_t>(10000, entry)))), tooLarge);
}

TEST(PropertyListReaderTest, RefusesOverlappingTextsThatExplode) {
  // Every object is a text that runs over all the following ones.
  constexpr std::size_t kTexts = 20000;
  constexpr std::size_t kSize = 10;
  std::string objects;
  for (std::size_t i = 0; i < kTexts; ++i)
    objects += "\x5F\x13" + bigEndian((kTexts - 1 - i) * kSize, 8);
  std::string array = "\xAF\x12" + bigEndian(kTexts, 4);
  for (std::size_t i = 0; i < kTexts; ++i) array += bigEndian(i, 4);
  std::string table;
  for (std::size_t i = 0; i <= kTexts; ++i) table += bigEndian(8 + i * kSize, 4);
  const std::string bytes = "bplist00" + objects + array + table + std::string(6, '\0') +
                            "\x04\x04" + bigEndian(kTexts + 1, 8) + bigEndian(kTexts, 8) +
                            bigEndian(8 + objects.size() + array.size(), 8);
  EXPECT_EQ(outcome(bytes),
            "PropertyList 2: a binary property list whose shared objects make it too large");
}

TEST(PropertyListReaderTest, RefusesSharedTextsThatWouldBeWrittenTooOften) {
  const auto outcomeOf = [](std::size_t size, std::size_t count) {
    BinaryPropertyList list(2);
    const auto key = list.addText("EpisodeName");
    const auto text = list.addText(std::string(size, 'x'));
    std::vector<std::uint64_t> entries;
    for (std::size_t i = 0; i < count; ++i) entries.push_back(list.addDictionary({key}, {text}));
    return outcome(list.bytes(list.addArray(entries))).substr(0, 100);
  };
  EXPECT_TRUE(outcomeOf(10'000, 1000).starts_with("[{\"EpisodeName\": \"xxx"));
  EXPECT_EQ(outcomeOf(100'000, 1000),
            "PropertyList 2: a binary property list whose shared objects make it too large");
}

TEST(PropertyListReaderTest, CountsWhatTextsBecome) {
  // Overlapping texts of bytes that are no ASCII: each byte becomes the three of U+FFFD.
  const auto outcomeOf = [](std::size_t size, std::size_t count) {
    BinaryPropertyList list(4);
    const std::string head = "\x5F\x12" + bigEndian(size, 4);
    std::vector<std::uint64_t> texts;
    for (std::size_t i = 0; i < count; ++i) texts.push_back(list.addBytes(head));
    list.addBytes(std::string(size, '\xFF'));
    return outcome(list.bytes(list.addArray(texts))).substr(0, 100);
  };
  // 10 MB of bytes, which would pass, but nearly 30 MB of UTF-8.
  EXPECT_EQ(outcomeOf(10'000, 100).substr(0, 2), "[\"");
  EXPECT_EQ(outcomeOf(10'000, 1000),
            "PropertyList 2: a binary property list whose shared objects make it too large");
}

TEST(PropertyListReaderTest, RefusesSharedElementsThatWouldBecomeTooManyRecords) {
  for (const std::string& element : {"\x09"s, "\xD0"s, "\x51x"s}) {
    const auto outcomeOf = [&element](std::size_t count) {
      BinaryPropertyList list;
      const std::vector<std::uint64_t> elements(count, list.addBytes(element));
      return outcome(list.bytes(list.addArray(elements))).substr(0, 100);
    };
    EXPECT_TRUE(outcomeOf(30'000).starts_with("["));
    EXPECT_EQ(outcomeOf(100'000),
              "PropertyList 2: a binary property list whose shared objects make it too large");
  }
}

TEST(PropertyListReaderTest, AcceptsUnsharedObjectsInAnyNumber) {
  BinaryPropertyList list(4);
  std::vector<std::uint64_t> elements;
  for (int i = 0; i < 300'000; ++i) elements.push_back(list.addBytes("\xD0"));
  EXPECT_TRUE(outcome(list.bytes(list.addArray(elements))).starts_with("[{}, {}"));
}

std::string smallBinaryList() {
  BinaryPropertyList list;
  const auto name = list.addText("Name");
  const auto text = list.addBytes("\x62\x00\xE9\x20\xAC"s);
  const auto number = list.addBytes("\x11\x01\x02");
  const auto real = list.addBytes("\x23\x3F\xF8\0\0\0\0\0\0"s);
  const auto date = list.addBytes("\x33\x41\xB0\0\0\0\0\0\0"s);
  const auto data = list.addBytes("\x4F\x10\x02\x01\x02");
  const auto yes = list.addBytes("\x09");
  const auto array = list.addArray({text, number, real, date, data, yes});
  return list.bytes(list.addDictionary({name}, {array}));
}

TEST(PropertyListReaderTest, RefusesBinaryListsCutAnywhere) {
  const std::string whole = smallBinaryList();
  ASSERT_EQ(outcome(whole),
            "{\"Name\": [\"\xC3\xA9\xE2\x82\xAC\", 258, 1.5r, "
            "2009-07-04T21:24:16.000, <0102>, true]}");
  for (std::size_t length = 0; length < whole.size(); ++length) {
    ErrorSlot error;
    EXPECT_FALSE(readPropertyList(whole.substr(0, length), error)) << length;
    EXPECT_TRUE(error) << length;
  }
}

TEST(PropertyListReaderTest, SurvivesBinaryListsWithAnyByteChanged) {
  const std::string whole = smallBinaryList();
  for (std::size_t i = 0; i < whole.size(); ++i) {
    for (int byte = 0; byte < 256; ++byte) {
      std::string changed = whole;
      changed[i] = static_cast<char>(byte);
      outcome(changed);  // expects either a value or an error
    }
  }
}

TEST(PropertyListReaderTest, LeavesTheSlotOfACallerAloneOnSuccess) {
  ErrorSlot error = ErrorRecord{.domain = "earlier", .code = 1, .description = "fault"};
  EXPECT_TRUE(readPropertyList("<plist><true/></plist>", error));
  EXPECT_EQ(error->domain, "earlier");
}

}  // namespace
}  // namespace platform
