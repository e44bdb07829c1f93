#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "platform/text/ErrorRecord.h"

namespace platform {

/// The name of an element as the document writes it, and its part behind the prefix.
///
/// Prefixes are not looked up: a feed with an undeclared prefix is common and readable all the
/// same, and whoever cares for a prefix compares the qualified name.
struct XMLName {
  std::string_view qualified;  // "orvane:image"
  std::string_view local;      // "image"
};

/// The attributes of one start tag, valid during the event only.
class XMLAttributes {
 public:
  /// `pairs` is a null-terminated array of name, value, name, value, ...
  explicit XMLAttributes(const char* const* pairs) : pairs_(pairs) {}
  /// The value of the attribute of this qualified name, references resolved; absent when there is
  /// none.
  std::optional<std::string_view> value(std::string_view name) const;

 private:
  const char* const* pairs_;
};

/// Receives the events of an XMLParser. Every text is UTF-8 and valid during the call only.
class XMLParserEvents {
 public:
  virtual ~XMLParserEvents() = default;
  virtual void didStartElement(const XMLName& name, const XMLAttributes& attributes) = 0;
  virtual void didEndElement(const XMLName& name) = 0;
  /// A run of character data, CDATA included. One text may arrive in any number of runs.
  virtual void foundCharacters(std::string_view text) = 0;
};

/// An event-driven parser of XML 1.0 over a document in memory, in one pass.
///
/// The encoding is told by a byte order mark or the declaration and may be any that the conversion
/// library knows; without either it is UTF-8. A document labelled ISO-8859-1 or US-ASCII is read as
/// windows-1252, which is what such documents mean. White space before the declaration is skipped.
///
/// Internal entities and attributes by default are resolved as long as what they add is not much
/// more than the document itself, and their declarations not too many; beyond that the document is
/// refused, so that what is delivered stays within a few times of it. External entities and DTDs
/// are never loaded. A reference to a declared external entity gives no characters; a
/// reference to an undeclared one is a fault, unless the document names an external DTD that could
/// declare it and is not standalone: then it gives no characters either.
class XMLParser {
 public:
  /// What the library can take at once, and what takes least time.
  static constexpr std::size_t kLargestWholeSize = std::size_t{1023} << 20U;

  /// The receiver must outlive `parse`. Move the bytes in where nobody else needs them: the parser
  /// gives them up as soon as it can, so that they do not lie beside all that is read from them. A
  /// document of more than `largestWholeSize` bytes is read in pieces, with the same events.
  XMLParser(std::string bytes, XMLParserEvents& events,
            std::size_t largestWholeSize = kLargestWholeSize)
      : bytes_(std::move(bytes)), events_(events), largestWholeSize_(largestWholeSize) {}

  /// Runs the whole parse on the calling thread; called once at most. On a malformed document
  /// returns false with a description that names the fault, the line and the column (both counted
  /// from 1, the column in characters): "mismatched tag at line 3, column 7". Events that came
  /// before the fault have been delivered. Records have the domain "XML" and expat's codes.
  /// Exhausted memory, in an event too, is such an error, but may have no place; other exceptions
  /// of an event pass through.
  bool parse(ErrorSlot& error);

  /// Ends the parse from inside an event: no other event follows, and `parse` returns false with
  /// this record.
  void abort(ErrorRecord error) { abortedWith_ = std::move(error); }

  /// Where the current event stands, for messages of the receiver: "line 3, column 7". Counts from
  /// the start of the document, so it is not for every event. Empty outside of `parse`.
  std::string position() const;

 private:
  struct Run;

  std::string bytes_;
  XMLParserEvents& events_;
  std::size_t largestWholeSize_;
  ErrorSlot abortedWith_;
  const Run* run_ = nullptr;  // while parse() runs
};

}  // namespace platform
