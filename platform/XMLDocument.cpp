#include "platform/XMLDocument.h"

#include <cstddef>
#include <new>
#include <pugixml.hpp>

#include "platform/XMLEscaping.h"

namespace platform {

namespace {

// The library escapes too little (a carriage return in a text), so what it holds is escaped
// already.
constexpr unsigned kFormat = pugi::format_indent | pugi::format_no_escapes;
constexpr const char* kIndent = "  ";

// The library reports exhausted memory by a null handle or by false; passing over it would lose a
// part of the document without a sign.
void requireMemory(bool isAllocated) {
  if (!isAllocated) throw std::bad_alloc();
}

pugi::xml_node appendElement(pugi::xml_node parent, std::string_view name) {
  pugi::xml_node element = parent.append_child(pugi::node_element);
  requireMemory(element.set_name(std::string(name).c_str()));
  return element;
}

class StringWriter : public pugi::xml_writer {
 public:
  explicit StringWriter(std::string& output) : output_(output) {}
  void write(const void* data, std::size_t size) override {
    output_.append(static_cast<const char*>(data), size);
  }

 private:
  std::string& output_;
};

}  // namespace

XMLElement XMLElement::appendChild(std::string_view name) {
  return XMLElement(appendElement(pugi::xml_node(node_), name).internal_object());
}

XMLElement XMLElement::appendChild(std::string_view name, std::string_view text) {
  const XMLElement child = appendChild(name);
  std::string escaped;
  appendEscapedText(escaped, text);
  pugi::xml_node content = pugi::xml_node(child.node_).append_child(pugi::node_pcdata);
  requireMemory(content.set_value(escaped.c_str()));
  return child;
}

void XMLElement::appendAttribute(std::string_view name, std::string_view value) {
  std::string escaped;
  appendEscapedAttribute(escaped, value);
  pugi::xml_attribute attribute = pugi::xml_node(node_).append_attribute(std::string(name).c_str());
  requireMemory(attribute.set_value(escaped.c_str()));
}

void XMLElement::declareNamespace(std::string_view prefix, std::string_view uri) {
  appendAttribute("xmlns:" + std::string(prefix), uri);
}

XMLDocument::XMLDocument() : document_(std::make_unique<pugi::xml_document>()) {
  pugi::xml_node declaration = document_->append_child(pugi::node_declaration);
  requireMemory(declaration.append_attribute("version").set_value("1.0"));
  requireMemory(declaration.append_attribute("encoding").set_value("UTF-8"));
}

XMLDocument::~XMLDocument() = default;
XMLDocument::XMLDocument(XMLDocument&&) noexcept = default;
XMLDocument& XMLDocument::operator=(XMLDocument&&) noexcept = default;

XMLElement XMLDocument::setRoot(std::string_view name) {
  return XMLElement(appendElement(*document_, name).internal_object());
}

std::string XMLDocument::serialised() const {
  std::string result;
  StringWriter writer(result);
  document_->save(writer, kIndent, kFormat, pugi::encoding_utf8);
  return result;
}

}  // namespace platform
