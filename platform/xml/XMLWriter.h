#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace platform {

class XMLWriter;

/// An element that an XMLWriter is writing. A copy stands for the same element.
///
/// Appending to an element ends the elements inside of it: they take nothing more.
class XMLElement {
 public:
  /// Appends a child element, which has no content yet. The name must last until it has ended.
  XMLElement appendChild(std::string_view name) const;
  /// Appends a child element that holds the text and nothing else.
  void appendChild(std::string_view name, std::string_view text) const;
  /// Appends an attribute; all of them come before the first child.
  void appendAttribute(std::string_view name, std::string_view value) const;
  /// Makes the text the content of the element, which has no child, and ends it.
  void endWithText(std::string_view text) const;

 private:
  friend class XMLWriter;
  XMLElement(XMLWriter& writer, std::size_t depth) : writer_(&writer), depth_(depth) {}

  XMLWriter* writer_;
  std::size_t depth_;  // of its children: the number of elements around them
};

/// Writes an XML 1.0 document in UTF-8 from its root down, one element a line, and keeps nothing of
/// it but the names of the open elements:
///
///   std::string feed;
///   XMLWriter writer(feed, kLayout);
///   const XMLElement rss = writer.appendRoot("rss");
///   rss.appendAttribute("version", "2.0");
///   const XMLElement channel = rss.appendChild("channel");
///   channel.appendChild("title", "Tom & Jerry");
///   channel.appendChild("item");
///   writer.finish();
///
/// makes
///
///   <?xml version="1.0" encoding="UTF-8"?>
///   <rss version="2.0">
///     <channel>
///       <title>Tom &amp; Jerry</title>
///       <item />
///     </channel>
///   </rss>
///
/// Texts and values are escaped so that they read back the same; what XML cannot hold of them is
/// left out. Names are written as they are.
class XMLWriter {
 public:
  struct Layout {
    char indentation;              // a tab or a space,
    std::size_t indentationWidth;  // so many of them for each level
    std::string_view emptyTagEnd;  // of an element without content
  };

  /// Appends everything to `output`, beginning with the XML declaration. The caller may take away
  /// what is there at any time.
  XMLWriter(std::string& output, Layout layout);
  XMLWriter(const XMLWriter&) = delete;
  XMLWriter& operator=(const XMLWriter&) = delete;

  /// Appends the root element; called once at most.
  XMLElement appendRoot(std::string_view name);
  /// Ends all elements.
  void finish() { endElements(0); }

 private:
  friend class XMLElement;
  void startElement(std::size_t depth, std::string_view name);
  void endElements(std::size_t depth);
  void indent();

  std::string& output_;
  Layout layout_;
  std::vector<std::string_view> open_;  // the names of the open elements
  bool isTagOpen_ = false;  // whether the innermost one has no content yet, and its tag no end
};

}  // namespace platform
