#pragma once

#include <functional>
#include <string>
#include <string_view>

#include "platform/xml/XMLParser.h"

/// Writes the events of a parser down as one line: elements as tags, with the value of the
/// attribute "a" where there is one, and characters as they come.
class XMLEventRecorder : public platform::XMLParserEvents {
 public:
  void didStartElement(const platform::XMLName& name,
                       const platform::XMLAttributes& attributes) override;
  void didEndElement(const platform::XMLName& name) override;
  void foundCharacters(std::string_view text) override;

  std::string events;
  std::function<void()> duringStart;
  std::function<void()> duringEnd;
  std::function<void()> duringCharacters;
};

/// The events of a document, or its fault: "mismatched tag at line 3, column 7".
std::string eventsOf(std::string_view document);

/// The text that many times.
std::string repeated(std::string_view text, std::size_t count);
