#include "platform/xml/XMLDocument.h"

#include <gtest/gtest.h>

#include <string>
#include <string_view>
#include <utility>

#include "platform/xml/XMLParser.h"

namespace platform {

using namespace std::string_view_literals;

namespace {

constexpr std::string_view kDeclaration = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n";

// Collects the text and one attribute of the element "text".
class TextReader : public XMLParserEvents {
 public:
  void didStartElement(const XMLName& name, const XMLAttributes& attributes) override {
    isInside_ = name.qualified == "text";
    if (isInside_) value = std::string(attributes.value("value").value_or("(none)"));
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

TEST(XMLDocumentTest, WithoutRootIsItsDeclarationAlone) {
  EXPECT_EQ(XMLDocument().serialised(), kDeclaration);
}

TEST(XMLDocumentTest, SerialisesElementsAttributesAndNamespacesInOrder) {
  XMLDocument document;
  XMLElement root = document.setRoot("rss");
  root.appendAttribute("version", "2.0");
  root.declareNamespace("dc", "http://purl.org/dc/elements/1.1/");
  root.declareNamespace("x", "https://example.com/?a=1&b=2");
  XMLElement channel = root.appendChild("channel");
  channel.appendChild("title", "Tom & \"Jerry\"");
  channel.appendChild("dc:creator", "");
  channel.appendChild("x:category").appendAttribute("text", "Arts & \"Crafts\"");
  channel.appendChild("item").appendChild("title", "<One>");

  EXPECT_EQ(
      document.serialised(),
      std::string(kDeclaration) +
          R"(<rss version="2.0" xmlns:dc="http://purl.org/dc/elements/1.1/" xmlns:x="https://example.com/?a=1&amp;b=2">
  <channel>
    <title>Tom &amp; "Jerry"</title>
    <dc:creator></dc:creator>
    <x:category text="Arts &amp; &quot;Crafts&quot;" />
    <item>
      <title>&lt;One&gt;</title>
    </item>
  </channel>
</rss>
)");
}

TEST(XMLDocumentTest, SerialisingTwiceGivesTheSame) {
  XMLDocument document;
  document.setRoot("a").appendChild("b", "c");
  EXPECT_EQ(document.serialised(), document.serialised());
}

TEST(XMLDocumentTest, ElementsStayValidWhenTheDocumentMoves) {
  XMLDocument document;
  XMLElement root = document.setRoot("a");
  XMLDocument moved = std::move(document);
  root.appendChild("b", "c");
  EXPECT_EQ(moved.serialised(), std::string(kDeclaration) + "<a>\n  <b>c</b>\n</a>\n");
}

TEST(XMLDocumentTest, TextsReadBackByteForByte) {
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
  };
  for (const std::string_view text : texts) {
    XMLDocument document;
    XMLElement parent = document.setRoot("root").appendChild("parent");
    parent.appendChild("text", text).appendAttribute("value", text);
    parent.appendChild("after");
    const std::string serialised = document.serialised();

    TextReader reader;
    ErrorSlot error;
    ASSERT_TRUE(XMLParser(serialised, reader).parse(error)) << error->description << serialised;
    EXPECT_EQ(reader.text, text) << serialised;
    EXPECT_EQ(reader.value, text) << serialised;
  }
}

TEST(XMLDocumentTest, LeavesOutWhatXMLCannotHold) {
  XMLDocument document;
  document.setRoot("a")
      .appendChild("b", "x\0\x01\xFF\xEF\xBF\xBFy"sv)
      .appendAttribute("c", "\x02z");
  EXPECT_EQ(document.serialised(), std::string(kDeclaration) + "<a>\n  <b c=\"z\">xy</b>\n</a>\n");
}

TEST(XMLDocumentTest, HoldsATextOfManyMegabytes) {
  std::string text;
  while (text.size() < std::size_t{20} << 20) text += "Rock & roll, “loud”.\r\n";
  XMLDocument document;
  document.setRoot("root").appendChild("text", text);
  const std::string serialised = document.serialised();

  TextReader reader;
  ErrorSlot error;
  ASSERT_TRUE(XMLParser(serialised, reader).parse(error)) << error->description;
  EXPECT_TRUE(reader.text == text);
}

// Were appending anything but constant in time, this would not end within a test's time limit.
TEST(XMLDocumentTest, TakesAQuarterMillionChildrenOfOneElement) {
  constexpr int kCount = 250'000;
  XMLDocument document;
  XMLElement root = document.setRoot("r");
  for (int child = 0; child < kCount; ++child) root.appendChild("c", "t");
  EXPECT_EQ(document.serialised().size(),
            kDeclaration.size() + "<r>\n</r>\n"sv.size() + kCount * "  <c>t</c>\n"sv.size());
}

}  // namespace

}  // namespace platform
