#include "platform/xml/ExpansionBudget.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "platform/xml/XMLParser.h"
#include "tests/support/XMLEventRecorder.h"

// What it counts and why shows in documents only, so they are what is tested.

namespace platform {
namespace {

constexpr std::string_view kBreach =
    "limit on input amplification factor (from DTD and entities) breached";

/// Counts the bytes of what it receives.
class Meter : public XMLParserEvents {
 public:
  void didStartElement(const XMLName& name, const XMLAttributes& attributes) override {
    size += name.qualified.size() + attributes.value("a").value_or("").size();
  }
  void didEndElement(const XMLName&) override {}
  void foundCharacters(std::string_view text) override { size += text.size(); }
  std::size_t size = 0;
};

/// The fault of the document with its line, empty when there is none.
std::string faultOf(ByteSource document, Meter& meter) {
  std::optional<XMLFault> fault;
  if (XMLParser(std::move(document), meter).parse(fault)) return {};
  return fault->description + " at line " + std::to_string(fault->position.line);
}

TEST(ExpansionBudgetTest, EntityBombsAreRefused) {
  std::string laughs = "<!DOCTYPE r [<!ENTITY e0 'ha ha ha ha'>";
  for (int level = 1; level <= 20; ++level) {
    const std::string below = "&e" + std::to_string(level - 1) + ";";
    laughs += "<!ENTITY e" + std::to_string(level) + " '";
    for (int copy = 0; copy < 10; ++copy) laughs += below;
    laughs += "'>";
  }
  laughs += "]>";
  std::string quadratic = "<!DOCTYPE r [<!ENTITY e '" + std::string(100'000, 'x') + "'>]>\n<r>";
  for (int copy = 0; copy < 10'000; ++copy) quadratic += "&e;";
  quadratic += "</r>";

  for (const std::string& bomb :
       {laughs + "\n<r>&e20;</r>", laughs + "\n<r a='&e20;'/>", quadratic}) {
    Meter meter;
    EXPECT_EQ(faultOf(bomb, meter), std::string(kBreach) + " at line 2");
    EXPECT_LT(meter.size, 50'000'000U);
  }
}

TEST(ExpansionBudgetTest, ConversionsOfCompressedDocumentsAreCounted) {
  const auto faultOfSize = [](std::size_t size, std::optional<std::uint64_t> compressedSize) {
    std::string document = "<?xml version='1.0' encoding='windows-1252'?>\n<!--";
    document.append(size, '\x80').append("--><r/>");  // each becomes three bytes
    Meter meter;
    return faultOf(ByteSource(std::move(document), compressedSize), meter);
  };
  EXPECT_EQ(faultOfSize(1'600'000, 1000), "");
  EXPECT_EQ(faultOfSize(1'700'000, 1000),
            "a document out of all proportion to its compressed form at line 1");
  EXPECT_EQ(faultOfSize(1'700'000, 3000), "");
  EXPECT_EQ(faultOfSize(1'700'000, std::nullopt), "");
}

std::string chainOfEntities(std::size_t length) {
  std::string chain = "<!ENTITY e0 'x'>";
  for (std::size_t link = 1; link <= length; ++link) {
    chain.append("<!ENTITY e").append(std::to_string(link));
    chain.append(" '&e").append(std::to_string(link - 1)).append(";'>");
  }
  return chain;
}

TEST(ExpansionBudgetTest, EntitiesInsideOfEntitiesCannotExhaustTheStack) {
  const struct {
    std::string_view declaration;
    std::string_view root;
    std::string_view events;
  } rows[] = {
      {"", "<r>&eN;</r>", "<r>x</r>"},
      {"", "<r a='&eN;'/>", "<r a=x></r>"},
      {"<!ATTLIST r a CDATA '&eN;'>", "<r/>", "<r a=x></r>"},
  };
  for (const auto& row : rows) {
    const auto outcome = [&row](std::size_t length) {
      const auto withNumber = [length](std::string_view text) {
        std::string result(text);
        if (const std::size_t place = result.find('N'); place != std::string::npos) {
          result.replace(place, 1, std::to_string(length));
        }
        return result;
      };
      return eventsOf("<!DOCTYPE r [\n" + chainOfEntities(length) + withNumber(row.declaration) +
                      "]>" + withNumber(row.root));
    };
    EXPECT_EQ(outcome(1000), row.events);
    for (const std::size_t length : {1001U, 100'000U}) {
      EXPECT_TRUE(
          outcome(length).starts_with("too many entities made of entities at line 2, column "))
          << row.root << " " << outcome(length).substr(0, 200);
    }
  }
}

TEST(ExpansionBudgetTest, EntitiesThatHoldNoEntitiesMayBeMany) {
  std::string declarations;
  for (int entity = 0; entity < 5000; ++entity) {
    declarations.append("<!ENTITY e").append(std::to_string(entity)).append(" '&#233;&#37;'>");
  }
  EXPECT_EQ(eventsOf("<!DOCTYPE r [" + declarations + "]><r>&e4999;</r>"), "<r>é%</r>");
}

std::string declaredAttributes(std::size_t count, std::string_view value) {
  std::string declarations;
  for (std::size_t attribute = 0; attribute < count; ++attribute) {
    declarations.append("<!ATTLIST r a").append(std::to_string(attribute)).append(" CDATA ");
    declarations.append(value).append(">");
  }
  return declarations;
}

TEST(ExpansionBudgetTest, DeclaredAttributesAreFew) {
  for (const std::string_view value : {"'v'", "#IMPLIED", "#REQUIRED"}) {
    EXPECT_EQ(eventsOf("<!DOCTYPE r [" + declaredAttributes(256, value) + "]><r/>"), "<r></r>");
    EXPECT_TRUE(eventsOf("<!DOCTYPE r [" + declaredAttributes(257, value) + "]><r/>")
                    .starts_with("too many declared attributes at line 1, column "))
        << value;
  }
}

TEST(ExpansionBudgetTest, DeclarationsMakeNothingMuchLargerThanTheDocument) {
  const std::string thousand(1000, 'x');
  const std::string entity = "<!DOCTYPE r [<!ENTITY e '" + thousand + "'>]>\n<r>";
  const std::string elements = "<!DOCTYPE r [<!ENTITY e '" + repeated("<i/>", 100) + "'>]>\n<r>";
  const std::string attribute = "<!DOCTYPE r [<!ATTLIST i a CDATA '" + thousand + "'>]>\n<r>";
  const struct {
    std::string_view name;
    std::string head;
    std::string_view part;
    std::size_t fits;     // so many parts are read
    std::size_t exceeds;  // and so many are not
  } rows[] = {
      {"text", entity, "&e;", 3350, 3400},
      {"text in an attribute", entity, "<i a='&e;'/>", 4100, 4300},
      {"elements", elements, "&e;", 4200, 4350},
      {"attributes by default", attribute, "<i/>", 7200, 7600},
  };
  for (const auto& row : rows) {
    Meter meter;
    EXPECT_EQ(faultOf(row.head + repeated(row.part, row.fits) + "</r>", meter), "") << row.name;

    for (const std::size_t count : {row.exceeds, std::size_t{100'000}}) {
      meter.size = 0;
      const std::string document = row.head + repeated(row.part, count) + "</r>";
      EXPECT_EQ(faultOf(document, meter), std::string(kBreach) + " at line 2") << row.name;
      EXPECT_LE(meter.size, (6U << 20) + 40 * document.size()) << row.name;
    }
  }
}

TEST(ExpansionBudgetTest, CompressedDocumentsStayInProportion) {
  constexpr const char* kOutOfProportion =
      "a document out of all proportion to its compressed form at line 1";
  const std::string deep = repeated("<a>", 50'000) + repeated("</a>", 50'000);
  const std::string wide = "<r>" + repeated("<a></a>", 50'000) + "</r>";
  const std::string text = "<r>" + std::string(5'000'000, 'x') + "</r>";
  const std::string latin = "<?xml version='1.0' encoding='ISO-8859-1'?><r>";
  const struct {
    std::string_view name;
    const std::string& document;
    std::size_t fits;     // compressed to so many bytes
    std::size_t exceeds;  // and not to so many
  } rows[] = {
      {"open elements", deep, 8000, 4000},
      {"elements that are over", wide, 0, 0},
      {"text", text, 11'000, 10'000},
      {"text that grows", latin + std::string(2'500'000, '\xE9') + "</r>", 26'000, 24'000},
  };
  for (const auto& row : rows) {
    const auto outcome = [&row](std::size_t compressedSize) {
      Meter meter;
      return faultOf(ByteSource(row.document, compressedSize), meter);
    };
    EXPECT_EQ(outcome(row.fits), "") << row.name;
    if (row.exceeds > 0) {
      EXPECT_EQ(outcome(row.exceeds), kOutOfProportion) << row.name;
    }
  }
}

TEST(ExpansionBudgetTest, ReceiversCountWhatMayGrow) {
  struct Keeper : XMLParserEvents {
    explicit Keeper(ByteSource document) : parser(std::move(document), *this) {}
    void didStartElement(const XMLName&, const XMLAttributes&) override {
      ++elements;
      parser.count([this](MemoryBudget& budget) { return ++counted, budget.take(1'000'000); });
    }
    void didEndElement(const XMLName&) override {}
    void foundCharacters(std::string_view) override {}

    XMLParser parser;
    std::size_t elements = 0;
    std::size_t counted = 0;
  };
  const std::string elements = "<r>" + repeated("<a/>", 99) + "</r>";
  const struct {
    ByteSource document;
    std::size_t elements;
    std::size_t counted;
  } rows[] = {
      {elements, 100, 0},
      {ByteSource(elements, 0), 7, 7},
      {"<!DOCTYPE r [<!ENTITY e 'x'>]>" + elements, 7, 7},
      {"<!DOCTYPE r [<!ATTLIST a b CDATA 'x'>]>" + elements, 7, 7},
      {"<!DOCTYPE r SYSTEM 'x'>" + elements, 100, 0},
  };
  for (const auto& row : rows) {
    Keeper keeper(row.document);
    std::optional<XMLFault> fault;
    EXPECT_EQ(keeper.parser.parse(fault), row.counted == 0);
    EXPECT_EQ(keeper.elements, row.elements);
    EXPECT_EQ(keeper.counted, row.counted);
  }
}

TEST(ExpansionBudgetTest, DeclarationsRefuseNoLongDocument) {
  const std::string head = "<!DOCTYPE r [<!ENTITY e 'x'><!ATTLIST b c CDATA 'd'>]><r>";
  for (const std::string_view part : {"<a/>", "<a b='c'/>", "<a>b</a>", "&e;", "&lt;"}) {
    std::string document = head;
    while (document.size() < 8'000'000) document += part;
    Meter meter;
    EXPECT_EQ(faultOf(document + "</r>", meter), "") << part;
  }
}

}  // namespace
}  // namespace platform
