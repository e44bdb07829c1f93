#include "platform/plist/XMLPropertyListReader.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "tests/support/PropertyListDump.h"
#include "tests/support/XMLEventRecorder.h"
namespace platform {
namespace {

using namespace std::string_literals;

std::string document(std::string_view content) {
  return "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
         "<!DOCTYPE plist PUBLIC \"-//Apple//DTD PLIST 1.0//EN\" "
         "\"http://www.apple.com/DTDs/PropertyList-1.0.dtd\">\n"
         "<plist version=\"1.0\">\n" +
         std::string(content) + "\n</plist>\n";
}

TEST(XMLPropertyListReaderTest, ReadsEveryKindOfXMLValue) {
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

TEST(XMLPropertyListReaderTest, ReadsXMLInAnyDress) {
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

TEST(XMLPropertyListReaderTest, RefusesXMLThatIsNoPropertyList) {
  const auto list = [](std::string_view content) {
    return "<plist>" + std::string(content) + "</plist>";
  };
  expectOutcomes({
      {"another document", "<rss/>",
       "a document whose root element is not \"plist\" at line 1, column 1"},
      {"a value without plist", "<dict/>",
       "a document whose root element is not \"plist\" at line 1, column 1"},
      {"prefixed plist", "<x:plist><true/></x:plist>",
       "a document whose root element is not \"plist\" at line 1, column 1"},
      {"no value", list(""), "a property list without a value at line 1, column 8"},
      {"two values", list("<true/><true/>"),
       "a second value in a property list at line 1, column 15"},
      {"value behind a container", list("<dict/><array/>"),
       "a second value in a property list at line 1, column 15"},
      {"plist in plist", list("<plist/>"), "an unexpected element \"plist\" at line 1, column 8"},
      {"unknown element", list("<dict><key>a</key><null/></dict>"),
       "an unexpected element \"null\" at line 1, column 26"},
      {"name in capitals", list("<String/>"),
       "an unexpected element \"String\" at line 1, column 8"},
      {"key at the root", list("<key>a</key>"),
       "a key outside of a dictionary at line 1, column 8"},
      {"key in an array", list("<array><key>a</key></array>"),
       "a key outside of a dictionary at line 1, column 15"},
      {"value without a key", list("<dict>\n\n  <key>a</key><true/>\n  <true/></dict>"),
       "a value without a key in a dictionary at line 4, column 3"},
      {"two keys", list("<dict><key>a</key>\n<key>b</key><true/></dict>"),
       "a key without a value in a dictionary at line 2, column 1"},
      {"key at the end", list("<dict><key>a</key>\n</dict>"),
       "a key without a value in a dictionary at line 2, column 1"},
      {"element in text", list("<string>a<string>b</string></string>"),
       "an element \"string\" inside of a value that holds text at line 1, "
       "column 17"},
      {"element in a key", list("<dict><key><true/></key></dict>"),
       "an element \"true\" inside of a value that holds text at line 1, "
       "column 19"},
      {"text in plist", list("a<true/>"),
       "text outside of a value that holds text at line 1, column 8"},
      {"text in an array", list("<array><true/> a</array>"),
       "text outside of a value that holds text at line 1, column 22"},
      {"text in a dictionary", list("<dict>&#160;</dict>"),
       "text outside of a value that holds text at line 1, column 14"},
      {"text in true", list("<true>yes</true>"),
       "text outside of a value that holds text at line 1, column 14"},
  });
}

TEST(XMLPropertyListReaderTest, RefusesMalformedXMLWithTheParsersFault) {
  expectOutcomes({
      {"white space", "   ", "no element found at line 1, column 4"},
      {"text", "x", "syntax error at line 1, column 1"},
      {"cut", "<plist>", "no element found at line 1, column 8"},
      {"mismatched", "<plist>\n<true></plist>", "mismatched tag at line 2, column 9"},
      {"two roots", "<plist><true/></plist>\n<plist/>",
       "junk after document element at line 2, column 1"},
      {"undeclared entity", "<plist><string>&nbsp;</string></plist>",
       "undefined entity at line 1, column 16"},
      {"control character", "<plist><string>\x01</string></plist>",
       "not well-formed (invalid token) at line 1, column 16"},
  });
}

TEST(XMLPropertyListReaderTest, RefusesScalarsThatAreNone) {
  const auto expectRefused = [](std::string_view element, const std::vector<std::string>& contents,
                                const std::string& fault) {
    for (const std::string& content : contents) {
      const std::string start = "<plist><" + std::string(element) + ">" + content;
      EXPECT_EQ(readOutcome(start + "</" + std::string(element) + "></plist>"),
                "" + fault + " at line 1, column " + std::to_string(start.size() + 1))
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
  expectRefused("date", {"", "Z", "2005-02-29T00:00:00Z", "tomorrow"},
                "a date that is none or out of range");
}

TEST(XMLPropertyListReaderTest, RefusesXMLCutAnywhere) {
  std::string whole = document(
      "<dict><key>Episodes</key><array><dict><key>EpisodeName</key><string>&lt;a&gt;</string>"
      "<key>EpisodeOrder</key><integer>1</integer><key>d</key><date>2005-05-16T12:30:45Z</date>"
      "<key>x</key><data>AAH/</data><key>t</key><true/></dict></array></dict>");
  whole.pop_back();  // the document ends before its last line break
  ASSERT_EQ(readOutcome(whole),
            "{\"Episodes\": [{\"EpisodeName\": \"<a>\", \"EpisodeOrder\": 1, \"d\": "
            "2005-05-16T12:30:45.000, \"t\": true, \"x\": <0001ff>}]}");
  for (std::size_t length = 0; length < whole.size(); ++length) {
    std::optional<PropertyListFault> fault;
    EXPECT_FALSE(readPropertyList(whole.substr(0, length), fault)) << length;
    EXPECT_TRUE(fault) << length;
  }
}

TEST(XMLPropertyListReaderTest, SurvivesXMLWithAnyBitFlipped) {
  const std::string whole =
      "<plist><dict><key>a</key><array><integer>12</integer><real>1.5</real><data>AAH/</data>"
      "<date>2005-05-16T12:30:45Z</date><true/><string>&lt;</string></array></dict></plist>";
  for (std::size_t i = 0; i < whole.size() * 8; ++i) {
    std::string flipped = whole;
    flipped[i / 8] = static_cast<char>(flipped[i / 8] ^ 1 << i % 8);
    readOutcome(flipped);  // expects either a value or an error
  }
}

TEST(XMLPropertyListReaderTest, LimitsTheDepthOfXML) {
  const auto arrays = [](std::size_t depth) {
    return "<plist>" + repeated("<array>", depth) + repeated("</array>", depth) + "</plist>";
  };
  EXPECT_EQ(readOutcome(arrays(512)), repeated("[", 512) + repeated("]", 512));
  EXPECT_EQ(readOutcome(arrays(513)),
            "arrays and dictionaries nested deeper than 512 levels at line 1, "
            "column 3592");
  const auto dictionaries = [](std::size_t depth) {
    return "<plist>" + repeated("<dict><key>a</key>", depth) + "<true/>" +
           repeated("</dict>", depth) + "</plist>";
  };
  EXPECT_EQ(readOutcome(dictionaries(512)),
            repeated("{\"a\": ", 512) + "true" + repeated("}", 512));
  EXPECT_EQ(readOutcome(dictionaries(513)),
            "arrays and dictionaries nested deeper than 512 levels at line 1, "
            "column 9224");
  EXPECT_EQ(readOutcome("<plist>" + repeated("<array>", 1000000)),
            "arrays and dictionaries nested deeper than 512 levels at line 1, "
            "column 3592");
}

TEST(XMLPropertyListReaderTest, CountsWhatEntitiesDeliver) {
  const std::string amps = repeated("&#38;amp;", 10'000);
  const struct {
    std::string entity;
    std::string_view around;
    std::size_t fits;
    std::size_t exceeds;
  } rows[] = {
      {"<dict/>", "<array>N</array>", 50'000, 90'000},
      {"<array/>", "<array>N</array>", 50'000, 90'000},
      {"<true/>", "<array>N</array>", 50'000, 90'000},
      {"<key/><true/>", "<dict>N</dict>", 55'000, 65'000},
      {amps, "<string>N</string>", 30, 100},
  };
  for (const auto& row : rows) {
    const auto outcome = [&row](std::size_t count) {
      std::string content(row.around);
      content.replace(content.find('N'), 1, repeated("&e;", count));
      return readOutcome("<!DOCTYPE plist [<!ENTITY e '" + row.entity + "'>]><plist>" + content +
                         "</plist>");
    };
    EXPECT_NE(outcome(row.fits).substr(0, 5), "limit") << row.entity.substr(0, 20);
    EXPECT_EQ(outcome(row.exceeds).substr(0, 32), "limit on input amplification fac")
        << row.entity.substr(0, 20);
  }
}

}  // namespace
}  // namespace platform
