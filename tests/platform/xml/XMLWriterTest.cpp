#include "platform/xml/XMLWriter.h"

#include <gtest/gtest.h>

#include <string>
#include <string_view>

#include "platform/xml/XMLParser.h"

namespace platform {

using namespace std::string_view_literals;

namespace {

constexpr std::string_view kDeclaration = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n";
constexpr XMLWriter::Layout kLayout = {
    .indentation = ' ', .indentationWidth = 2, .emptyTagEnd = " />"};

/// What is written of a document whose root, "r", the function fills; without its declaration.
template <typename Fill>
std::string written(Fill fill, XMLWriter::Layout layout = kLayout) {
  std::string output;
  XMLWriter writer(output, layout);
  fill(writer.appendRoot("r"));
  writer.finish();
  EXPECT_TRUE(output.starts_with(kDeclaration));
  return output.substr(kDeclaration.size());
}

// Collects the text and one attribute of the element "text".
class TextReader : public XMLParserEvents {
 public:
  void didStartElement(const XMLName& name, const XMLAttributes& attributes) override {
    isInside_ = name.qualified == "text";
    if (name.qualified == "value") value = std::string(attributes.value("value").value_or("none"));
  }
  void didEndElement(const XMLName&) override { isInside_ = false; }
  void foundCharacters(std::string_view run) override {
    if (isInside_) text += run;
  }

  std::string text;
  std::string value;

 private:
  bool isInside_ = false;
};

TEST(XMLWriterTest, ADocumentWithoutRootIsItsDeclarationAlone) {
  std::string output = "before";
  XMLWriter(output, kLayout).finish();
  EXPECT_EQ(output, "before" + std::string(kDeclaration));
}

TEST(XMLWriterTest, WritesElementsAndAttributesInOrder) {
  EXPECT_EQ(written([](XMLElement rss) {
              rss.appendAttribute("version", "2.0");
              rss.appendAttribute("xmlns:x", "https://example.com/?a=1&b=2");
              const XMLElement channel = rss.appendChild("channel");
              channel.appendChild("title", "Tom & \"Jerry\"");
              channel.appendChild("dc:creator", "");
              channel.appendChild("x:category").appendAttribute("text", "Arts & \"Crafts\"");
              channel.appendChild("item").appendChild("title", "<One>");
            }),
            R"(<r version="2.0" xmlns:x="https://example.com/?a=1&amp;b=2">
  <channel>
    <title>Tom &amp; "Jerry"</title>
    <dc:creator></dc:creator>
    <x:category text="Arts &amp; &quot;Crafts&quot;" />
    <item>
      <title>&lt;One&gt;</title>
    </item>
  </channel>
</r>
)");
}

TEST(XMLWriterTest, TheLayoutIsTheCallers) {
  const auto fill = [](XMLElement root) { root.appendChild("a").appendChild("b"); };
  EXPECT_EQ(written(fill, {.indentation = '\t', .indentationWidth = 1, .emptyTagEnd = "/>"}),
            "<r>\n\t<a>\n\t\t<b/>\n\t</a>\n</r>\n");
  EXPECT_EQ(written(fill, {.indentation = ' ', .indentationWidth = 0, .emptyTagEnd = " />"}),
            "<r>\n<a>\n<b />\n</a>\n</r>\n");
  EXPECT_EQ(written([](XMLElement) {}), "<r />\n");
}

TEST(XMLWriterTest, AppendingToAnElementEndsTheElementsInsideOfIt) {
  EXPECT_EQ(written([](XMLElement root) {
              const XMLElement first = root.appendChild("first");
              first.appendChild("a").appendChild("b").appendChild("c", "text");
              first.appendChild("d").appendChild("e");
              root.appendChild("second", "text");
              root.appendChild("third").appendChild("f");
            }),
            R"(<r>
  <first>
    <a>
      <b>
        <c>text</c>
      </b>
    </a>
    <d>
      <e />
    </d>
  </first>
  <second>text</second>
  <third>
    <f />
  </third>
</r>
)");
}

TEST(XMLWriterTest, WhatIsWrittenMayBeTakenAwayMeanwhile) {
  std::string output;
  XMLWriter writer(output, kLayout);
  const XMLElement root = writer.appendRoot("r");
  EXPECT_EQ(output, std::string(kDeclaration) + "<r");
  output.clear();
  root.appendChild("a", "b");
  EXPECT_EQ(output, ">\n  <a>b</a>\n");
  output.clear();
  writer.finish();
  EXPECT_EQ(output, "</r>\n");
}

TEST(XMLWriterTest, TextsAndAttributesReadBackByteForByte) {
  std::string megabytes;
  while (megabytes.size() < std::size_t{20} << 20) megabytes += "Rock & roll, “loud”.\r\n";
  const std::string_view texts[] = {
      "",
      " ",
      "\n",
      "\t\n \n",
      "  leading and trailing  ",
      "\nlines\n  indented\n\n",
      "carriage\rreturn",
      "\r\n",
      "\r",
      "]]>",
      "<![CDATA[ & ]]>",
      "&amp;&#13;",
      "\"quotes\" and 'apostrophes'",
      "é 日本語 😀 \u0085\u2028\uFEFF",
      "<?xml version=\"1.0\"?>",
      "<!-- -->",
      megabytes,
  };
  for (const std::string_view text : texts) {
    const std::string document = written([text](XMLElement root) {
      root.appendChild("value").appendAttribute("value", text);
      const XMLElement parent = root.appendChild("parent");
      parent.appendChild("text", text);
      parent.appendChild("after");
    });
    const std::string shown = document.substr(0, 1000);

    TextReader reader;
    std::optional<XMLFault> fault;
    ASSERT_TRUE(XMLParser(document, reader).parse(fault)) << fault->description << shown;
    EXPECT_TRUE(reader.text == text) << shown;
    EXPECT_TRUE(reader.value == text) << shown;
  }
}

TEST(XMLWriterTest, LeavesOutWhatXMLCannotHold) {
  EXPECT_EQ(written([](XMLElement root) {
              root.appendAttribute("c", "\x02z");
              root.appendChild("b", "x\0\x01\xFF\xEF\xBF\xBFy"sv);
            }),
            "<r c=\"z\">\n  <b>xy</b>\n</r>\n");
}

// Were appending anything but constant in time, this would not end within a test's time limit.
TEST(XMLWriterTest, TakesAQuarterMillionChildrenOfOneElement) {
  constexpr int kCount = 250'000;
  const std::string document = written([](XMLElement root) {
    for (int child = 0; child < kCount; ++child) root.appendChild("c", "t");
  });
  EXPECT_EQ(document.size(), "<r>\n</r>\n"sv.size() + kCount * "  <c>t</c>\n"sv.size());
}

}  // namespace
TEST(XMLWriterTest, TextCanFollowAttributes) {
  std::string document;
  XMLWriter writer(document, {.indentation = ' ', .indentationWidth = 2, .emptyTagEnd = " />"});
  const XMLElement root = writer.appendRoot("a");
  const XMLElement child = root.appendChild("b");
  child.appendAttribute("c", "1");
  child.endWithText("<&");
  root.appendChild("d");
  writer.finish();
  EXPECT_EQ(document,
            "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
            "<a>\n  <b c=\"1\">&lt;&amp;</b>\n  <d />\n</a>\n");
}

}  // namespace platform
