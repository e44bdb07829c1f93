#include <algorithm>
#include <string>
#include <vector>

#include "fuzz/FuzzTarget.h"
#include "fuzz/PropertyListRoundTrip.h"
#include "platform/xml/XMLParser.h"
#include "platform/xml/XMLWriter.h"

namespace {

/// What a document holds, in one text: what was written, and what the parser tells of it.
class Contents {
 public:
  void start(std::string_view name) { text_.append("<").append(name).append(">"); }
  void attribute(std::string_view name, std::string_view value) {
    text_.append(name).append("=").append(value).append(";");
  }
  void characters(std::string_view characters) { text_ += characters; }
  void end() { text_ += "</>"; }

  friend bool operator==(const Contents&, const Contents&) = default;

 private:
  std::string text_;
};

constexpr std::string_view kContainer = "rss";
constexpr std::string_view kTextHolder = "orvane:summary";
constexpr std::string_view kAttributeHolder = "enclosure";
constexpr std::string_view kAttribute = "url";

class ContentsReader : private platform::XMLParserEvents {
 public:
  /// The contents of a document that is well-formed.
  static Contents read(const std::string& document) {
    ContentsReader reader;
    platform::XMLParser parser(document, reader);
    std::optional<platform::XMLFault> fault;
    requireThat(parser.parse(fault), "a document that was written is well-formed");
    return reader.contents_;
  }

 private:
  void didStartElement(const platform::XMLName& name,
                       const platform::XMLAttributes& attributes) override {
    contents_.start(name.qualified);
    if (const auto value = attributes.value(kAttribute)) contents_.attribute(kAttribute, *value);
    holdsText_ = name.qualified == kTextHolder;
  }
  void didEndElement(const platform::XMLName& /*name*/) override {
    contents_.end();
    holdsText_ = false;
  }
  void foundCharacters(std::string_view text) override {
    if (holdsText_) {
      contents_.characters(text);
    } else {
      requireThat(text.find_first_not_of(" \n") == std::string_view::npos,
                  "between elements there is indentation");
    }
  }

  Contents contents_;
  bool holdsText_ = false;
};

/// Writes a document by instructions of one byte and a text that ends at the next byte 0xFF, which
/// no text of XML holds.
class Scribe {
 public:
  Scribe() : open_{writer_.appendRoot(kContainer)} { contents_.start(kContainer); }

  void follow(char instruction, std::string_view text) {
    switch (instruction) {
      case '(':
        open_.push_back(open_.back().appendChild(kContainer));
        contents_.start(kContainer);
        break;
      case ')':
        if (open_.size() > 1) close();
        break;
      case '=':
        open_.back().appendChild(kAttributeHolder).appendAttribute(kAttribute, text);
        contents_.start(kAttributeHolder);
        contents_.attribute(kAttribute, xmlText(text));
        contents_.end();
        break;
      default:
        open_.back().appendChild(kTextHolder, text);
        contents_.start(kTextHolder);
        contents_.characters(xmlText(text));
        contents_.end();
        break;
    }
  }

  void requireReadsBack() {
    writer_.finish();
    while (!open_.empty()) close();
    requireThat(ContentsReader::read(bytes_) == contents_, "a document reads back the same");
  }

 private:
  void close() {
    open_.pop_back();
    contents_.end();
  }

  std::string bytes_;
  platform::XMLWriter writer_{bytes_,
                              {.indentation = ' ', .indentationWidth = 2, .emptyTagEnd = " />"}};
  std::vector<platform::XMLElement> open_;
  Contents contents_;
};

}  // namespace

/// Any document of containers, texts and attributes: it is well-formed and reads back as what XML
/// can hold of it.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  std::string_view input = inputText(data, size);
  Scribe scribe;
  while (!input.empty()) {
    const char instruction = input.front();
    input.remove_prefix(1);
    const std::string_view text = input.substr(0, input.find('\xFF'));
    scribe.follow(instruction, text);
    input.remove_prefix(std::min(text.size() + 1, input.size()));
  }
  scribe.requireReadsBack();
  return 0;
}
