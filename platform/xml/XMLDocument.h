#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>

namespace pugi {
struct xml_node_struct;
}  // namespace pugi

namespace platform {

/// A handle of one element of an XMLDocument; valid as long as the document is.
class XMLElement {
  struct Tree;

 public:
  /// Appends a child element without content and returns it.
  XMLElement appendChild(std::string_view name);
  /// Appends a child element that holds the text, escaped so that it reads back the same.
  XMLElement appendChild(std::string_view name, std::string_view text);
  /// Appends an attribute; attributes keep the order in which they were appended.
  void appendAttribute(std::string_view name, std::string_view value);
  /// Declares a namespace on this element (an "xmlns:prefix" attribute).
  void declareNamespace(std::string_view prefix, std::string_view uri);

 private:
  friend class XMLDocument;
  XMLElement(Tree& tree, pugi::xml_node_struct* parent, std::string_view name);

  Tree* tree_;  // of the document
  pugi::xml_node_struct* node_;
};

/// An XML document tree, built from the root down and serialised once. The document's version,
/// encoding and content kind are always those of plain XML 1.0 in UTF-8.
class XMLDocument {
 public:
  /// A document without a root: it serialises to its XML declaration alone.
  XMLDocument();
  ~XMLDocument();
  XMLDocument(XMLDocument&&) noexcept;
  XMLDocument& operator=(XMLDocument&&) noexcept;

  /// Makes the root element; called once at most.
  XMLElement setRoot(std::string_view name);

  /// The document in UTF-8, pretty-printed. Text content is never re-indented.
  std::string serialised() const;

 private:
  std::unique_ptr<XMLElement::Tree> tree_;
};

}  // namespace platform
