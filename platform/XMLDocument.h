#pragma once

#include <memory>
#include <string>
#include <string_view>

namespace pugi {
class xml_document;
struct xml_node_struct;
}  // namespace pugi

namespace platform {

/// A handle of one element of an XMLDocument; valid as long as the document is.
class XMLElement {
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
  explicit XMLElement(pugi::xml_node_struct* node) : node_(node) {}
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
  std::unique_ptr<pugi::xml_document> document_;
};

}  // namespace platform
