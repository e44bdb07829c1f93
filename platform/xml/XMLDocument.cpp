#include "platform/xml/XMLDocument.h"

#include <cstddef>
#include <new>
#include <pugixml.hpp>

#include "platform/xml/XMLEscaping.h"

namespace platform {

namespace {

// The library escapes too little (a carriage return in a text), so what it holds is escaped
// already.
constexpr unsigned kFormat = pugi::format_indent | pugi::format_no_escapes;
constexpr const char* kIndent = "  ";
constexpr std::size_t kDeclarationSize = 64;

// The library reports exhausted memory by a null handle or by false; passing over it would lose a
// part of the document without a sign.
void requireMemory(bool isAllocated) {
  if (!isAllocated) throw std::bad_alloc();
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

// The nodes, and about how many bytes they take when they are written: a text that large must not
// be moved again and again while it grows.
struct XMLElement::Tree {
  pugi::xml_document document;
  std::size_t size = 0;
};

XMLElement::XMLElement(Tree& tree, pugi::xml_node_struct* parent, std::string_view name)
    : tree_(&tree) {
  pugi::xml_node element = pugi::xml_node(parent).append_child(pugi::node_element);
  requireMemory(element.set_name(std::string(name).c_str()));
  node_ = element.internal_object();
  constexpr std::size_t kSizeAroundNames = 16;  // brackets, indentation and line break
  tree_->size += 2 * name.size() + kSizeAroundNames;
}

XMLElement XMLElement::appendChild(std::string_view name) {
  return {*tree_, node_, name};
}

XMLElement XMLElement::appendChild(std::string_view name, std::string_view text) {
  const XMLElement child = appendChild(name);
  std::string escaped;
  appendEscapedText(escaped, text);
  pugi::xml_node content = pugi::xml_node(child.node_).append_child(pugi::node_pcdata);
  requireMemory(content.set_value(escaped.c_str()));
  tree_->size += escaped.size();
  return child;
}

void XMLElement::appendAttribute(std::string_view name, std::string_view value) {
  std::string escaped;
  appendEscapedAttribute(escaped, value);
  pugi::xml_attribute attribute = pugi::xml_node(node_).append_attribute(std::string(name).c_str());
  requireMemory(attribute.set_value(escaped.c_str()));
  constexpr std::size_t kSizeAroundValue = 4;  // space, equals sign and quotes
  tree_->size += name.size() + escaped.size() + kSizeAroundValue;
}

void XMLElement::declareNamespace(std::string_view prefix, std::string_view uri) {
  appendAttribute("xmlns:" + std::string(prefix), uri);
}

XMLDocument::XMLDocument() : tree_(std::make_unique<XMLElement::Tree>()) {
  pugi::xml_node declaration = tree_->document.append_child(pugi::node_declaration);
  requireMemory(declaration.append_attribute("version").set_value("1.0"));
  requireMemory(declaration.append_attribute("encoding").set_value("UTF-8"));
}

XMLDocument::~XMLDocument() = default;
XMLDocument::XMLDocument(XMLDocument&&) noexcept = default;
XMLDocument& XMLDocument::operator=(XMLDocument&&) noexcept = default;

XMLElement XMLDocument::setRoot(std::string_view name) {
  return {*tree_, tree_->document.internal_object(), name};
}

std::string XMLDocument::serialised() const {
  std::string result;
  StringWriter writer(result);
  result.reserve(tree_->size + kDeclarationSize);
  tree_->document.save(writer, kIndent, kFormat, pugi::encoding_utf8);
  return result;
}

}  // namespace platform
