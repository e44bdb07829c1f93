#include "platform/xml/DocumentEncoding.h"

#include <gtest/gtest.h>

#include <string>
#include <string_view>

#include "platform/text/TextEncoding.h"
#include "tests/support/XMLEventRecorder.h"

namespace platform {

using namespace std::string_literals;
using namespace std::string_view_literals;

namespace {

/// An ASCII text in 16 or 32 bits.
std::string widened(std::string_view ascii, std::size_t zerosBefore, std::size_t zerosBehind) {
  std::string result;
  for (const char character : ascii) {
    result.append(zerosBefore, '\0').append(1, character).append(zerosBehind, '\0');
  }
  return result;
}

TEST(DocumentEncodingTest, AMarkDecidesBeforeTheZerosAndTheseBeforeTheDeclaration) {
  const std::string plain = "<?xml version='1.0'?>\n<r>text</r>";
  const std::string declared = "<?xml version='1.0' encoding='ISO-8859-1'?>\n<r>text</r>";
  for (const std::string& text : {plain, declared, "\n " + plain}) {
    const struct {
      std::string_view name;
      std::size_t markLength;
      std::string document;
    } rows[] = {
        {"UTF-8", 3, "\xEF\xBB\xBF" + text},
        {"UTF-16LE", 2, "\xFF\xFE" + widened(text, 0, 1)},
        {"UTF-16BE", 2, "\xFE\xFF" + widened(text, 1, 0)},
        {"UTF-16LE", 0, widened(text, 0, 1)},
        {"UTF-16BE", 0, widened(text, 1, 0)},
        {"UTF-32LE", 4, "\xFF\xFE\0\0"s + widened(text, 0, 3)},
        {"UTF-32BE", 4, "\0\0\xFE\xFF"s + widened(text, 3, 0)},
        {"UTF-32LE", 0, widened(text, 0, 3)},
        {"UTF-32BE", 0, widened(text, 3, 0)},
    };
    for (const auto& row : rows) {
      const DocumentEncoding encoding = DocumentEncoding::of(row.document);
      EXPECT_EQ(encoding.name, row.name) << testing::PrintToString(row.document);
      EXPECT_EQ(encoding.markLength, row.markLength) << testing::PrintToString(row.document);
      EXPECT_EQ(encoding.label, "") << testing::PrintToString(row.document);
      EXPECT_EQ(eventsOf(row.document), "<r>text</r>") << testing::PrintToString(row.document);
    }
  }
}

TEST(DocumentEncodingTest, AHintCountsWhereTheDocumentTellsNothingAndIsNoUTF8) {
  const struct {
    std::string_view document;
    std::string_view hint;
    std::string_view name;
  } rows[] = {
      {"<r>\xC4</r>", "windows-1251", "ibm-5347_P100-1998"},
      {"<?xml version='1.0'?><r>\xC4</r>", "latin1", "windows-1252"},
      {"<r>\xC4</r>", "us-ascii", "windows-1252"},
      {"<r>\xC4</r>", "utf-16", "UTF-8"},
      {"<r>\xC4</r>", "unheard-of", "UTF-8"},
      {"<r>\xC4</r>", "", "UTF-8"},
      {"<r>\u00C4</r>", "KOI8-R", "UTF-8"},
      {"\xEF\xBB\xBF<r>\xC4</r>", "KOI8-R", "UTF-8"},
      {"<?xml version='1.0' encoding='UTF-8'?><r>\xC4</r>", "KOI8-R", "UTF-8"},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(DocumentEncoding::of(row.document, row.hint).name, row.name) << row.document;
  }
}

TEST(DocumentEncodingTest, TheDeclarationNamesIt) {
  const struct {
    std::string_view document;
    std::string_view name;  // empty for one that is not known
    std::string_view label;
  } rows[] = {
      {"", "UTF-8", ""},
      {"<r/>", "UTF-8", ""},
      {"<\0r"sv, "UTF-8", ""},  // too short to tell
      {"<?xml version='1.0'?><r encoding='KOI8-R'/>", "UTF-8", ""},
      {"<?xml version='1.0' encoding='utf-8'?>", "UTF-8", "utf-8"},
      {"<?xml version='1.0' encoding='KOI8-R'?>", "KOI8-R", "KOI8-R"},
      {"<?xml version=\"1.0\"\n\tencoding = \"Shift_JIS\" ?>", "Shift_JIS", "Shift_JIS"},
      {" \r\n\t<?xml encoding='EUC-KR' version='1.0'?>", "EUC-KR", "EUC-KR"},
      {"<?xml é='1' encoding='KOI8-R'?>", "KOI8-R", "KOI8-R"},
      // What such documents mean.
      {"<?xml encoding='ISO-8859-1'?>", "windows-1252", "ISO-8859-1"},
      {"<?xml encoding='latin1'?>", "windows-1252", "latin1"},
      {"<?xml encoding='us-ascii'?>", "windows-1252", "us-ascii"},
      {"<?xml encoding='UTF-16'?>", "UTF-8", "UTF-16"},
      {"<?xml encoding='UTF-32LE'?>", "UTF-8", "UTF-32LE"},
      {"<?xml encoding='klingon'?>", "", "klingon"},
      // Malformed declarations are the parser's to tell.
      {"<?xml encoding=''?>", "UTF-8", ""},
      {"<?xml encoding='UTF 9'?>", "UTF-8", ""},
      {"<?xml encoding='8-UTF'?>", "UTF-8", ""},
      {"<?xml encoding='UTF#'?>", "UTF-8", ""},
      {"<?xml encoding='KOI8-R", "UTF-8", ""},
      {"<?xml encoding='KOI8-R>'", "UTF-8", ""},
      {"<?xml encoding=KOI8-R?>", "UTF-8", ""},
      {"<?xml encoding 'KOI8-R'?>", "UTF-8", ""},
      {"<?xml 'KOI8-R'?>", "UTF-8", ""},
      {"<?xml", "UTF-8", ""},
  };
  for (const auto& row : rows) {
    const DocumentEncoding encoding = DocumentEncoding::of(row.document);
    EXPECT_EQ(canonicalEncodingName(encoding.name.value_or("")), canonicalEncodingName(row.name))
        << testing::PrintToString(row.document);
    EXPECT_EQ(encoding.label, row.label) << testing::PrintToString(row.document);
  }
}

TEST(DocumentEncodingTest, TheParserReadsEveryEncoding) {
  const struct {
    std::string_view document;
    std::string_view events;
  } rows[] = {
      {"<r>é</r>", "<r>é</r>"},
      {"\xEF\xBB\xBF<r>é</r>", "<r>é</r>"},
      {"\xEF\xBB\xBF<?xml version='1.0' encoding='ISO-8859-1'?><r>é</r>", "<r>é</r>"},
      {"<?xml version='1.0' encoding='UTF-16'?><r>é</r>", "<r>é</r>"},
      {"\xFF\xFE<\0r\0>\0\xE9\0\x3D\xD8\x00\xDE<\0/\0r\0>\0"sv, "<r>é😀</r>"},
      {"<?xml version='1.0' encoding='ISO-8859-1'?><r a='\xE9'>\xE9 \x93\x80\x94</r>",
       "<r a=é>é “€”</r>"},
      {"<?xml version='1.0' encoding='us-ascii'?><r>\x80</r>", "<r>€</r>"},
      {"<?xml version='1.0' encoding='Shift_JIS'?><r>\x93\xFA\x96\x7B\x8C\xEA \x83\x5C</r>",
       "<r>日本語 ソ</r>"},
      {"<?xml version='1.0' encoding='EUC-KR'?><r>\xC7\xD1\xB1\xB9</r>", "<r>한국</r>"},
      {"<?xml version='1.0' encoding='GB2312'?><r>\xD6\xD0\xCE\xC4</r>", "<r>中文</r>"},
      {"<?xml version='1.0' encoding='KOI8-R'?><r>\xD0\xCF\xC4</r>", "<r>под</r>"},
      {"<?xml version='1.0' encoding='Shift_JIS'?><r>a\xFEz</r>", "<r>a\uFFFDz</r>"},
      {"\n<?xml version='1.0' encoding='ISO-8859-1'?><r>\xE9</r>", "<r>é</r>"},
      // Programs that put white space in front put it in front of a mark, too.
      {"\n \xEF\xBB\xBF<?xml version='1.0'?><r>é</r>", "<r>é</r>"},
      {"\xEF\xBB\xBF\r\n\t  \n<?xml version='1.0'?><r>é</r>", "<r>é</r>"},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(eventsOf(row.document), row.events) << testing::PrintToString(row.document);
  }
}

}  // namespace
}  // namespace platform
