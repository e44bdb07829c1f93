#include "platform/xml/RootElement.h"

#include <utility>

#include "platform/xml/XMLParser.h"

namespace platform {
namespace {

/// Ends the parse at the first element.
class Finder final : private XMLParserEvents {
 public:
  explicit Finder(std::string head) : parser_(std::move(head), *this) {}

  std::optional<std::string> find() {
    std::optional<XMLFault> ignored;
    parser_.parse(ignored);
    return std::move(name_);
  }

 private:
  void didStartElement(const XMLName& name, const XMLAttributes& /*attributes*/) override {
    name_ = name.qualified;
    parser_.abort("found");
  }
  void didEndElement(const XMLName& /*name*/) override {}
  void foundCharacters(std::string_view /*text*/) override {}

  XMLParser parser_;
  std::optional<std::string> name_;
};

}  // namespace

std::optional<std::string> rootElementName(std::string_view head) {
  return Finder(std::string(head)).find();
}

}  // namespace platform
