#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "platform/text/ByteSource.h"
#include "platform/text/ErrorRecord.h"
#include "platform/xml/MemoryBudget.h"
#include "platform/xml/TextPosition.h"

namespace platform {

/// What is wrong with a document, and where.
struct XMLFault {
  std::int64_t code = 0;    // the library's
  std::string description;  // "mismatched tag"
  TextPosition position = {};
  ErrorSlot reading = {};  // why it could not be read, if that is what is wrong

  /// The same for whoever shows a sentence: "mismatched tag at line 3, column 7", of the domain
  /// "XML"; or why it could not be read.
  ErrorRecord record() const;
};

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

/// Receives the events of an XMLParser. Every text is UTF-8 and valid during the call only. No
/// event throws, since the library behind the parser is C.
class XMLParserEvents {
 public:
  virtual ~XMLParserEvents() = default;
  virtual void didStartElement(const XMLName& name, const XMLAttributes& attributes) = 0;
  virtual void didEndElement(const XMLName& name) = 0;
  /// A run of character data, CDATA included. One text may arrive in any number of runs.
  virtual void foundCharacters(std::string_view text) = 0;
};

/// An event-driven parser of XML 1.0 over a document, in one pass:
///
///   struct Counter : XMLParserEvents {
///     void didStartElement(const XMLName& name, const XMLAttributes&) override {
///       if (name.local == "item") ++items;
///     }
///     void didEndElement(const XMLName&) override {}
///     void foundCharacters(std::string_view) override {}
///     int items = 0;
///   } counter;
///   std::optional<XMLFault> fault;
///   if (!XMLParser(std::move(bytes), counter).parse(fault)) show(fault->description);
///
/// The encoding is what DocumentEncoding detects, any that the conversion library knows. White
/// space before the declaration is skipped.
///
/// Internal entities and attributes by default are resolved as long as what is made of them is not
/// much more than the document itself, and their declarations not too many; beyond that the
/// document is refused, and so is a compressed one of which much more is made than was received. To
/// make something of a document is the receiver's work, so it counts, too (see `count`). External
/// entities and DTDs are never loaded. A reference to a declared external entity gives no
/// characters; a reference to an undeclared one is a fault, unless the document names an external
/// DTD that could declare it and is not standalone: then it gives no characters either.
class XMLParser {
 public:
  /// Up to this size a document is parsed in one buffer: the fastest way, and the most that expat
  /// takes.
  static constexpr std::size_t kLargestWholeSize = std::size_t{1023} << 20U;

  /// The receiver must outlive `parse`. A document of more than `largestWholeSize` bytes is read in
  /// pieces, with the same events.
  XMLParser(ByteSource document, XMLParserEvents& events,
            std::size_t largestWholeSize = kLargestWholeSize)
      : document_(std::move(document)), events_(events), largestWholeSize_(largestWholeSize) {}

  /// Runs the whole parse on the calling thread; called once at most. On a malformed document
  /// returns false with its first fault; the events that came before it have been delivered.
  bool parse(std::optional<XMLFault>& fault);

  /// Ends the parse from inside an event: no other event follows, and `parse` returns false with
  /// this fault, at the place of the event.
  void abort(std::string description);

  /// Where the event stands that is being delivered: a tag where its "<" does. To be asked from
  /// inside of an event only; each answer counts the lines since the one before.
  TextPosition position() const;

  /// Counts, inside an event, what the receiver makes of the document by this function of a
  /// MemoryBudget, which gives false when there is too little left: that ends the parse as `abort`
  /// does. Documents that cannot grow are not counted, and the function is not called.
  template <typename Take>
  void count(Take take) {
    if (MemoryBudget* const budget = budgetToCount(); budget != nullptr && !take(*budget)) {
      refuseExpansion();
    }
  }

 private:
  struct Run;

  /// Null where nothing is counted.
  MemoryBudget* budgetToCount();
  void refuseExpansion();

  ByteSource document_;
  XMLParserEvents& events_;
  std::size_t largestWholeSize_;
  Run* run_ = nullptr;  // while parse() runs
};

}  // namespace platform
