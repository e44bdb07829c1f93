#include "tests/support/XMLEventRecorder.h"

#include <optional>

void XMLEventRecorder::didStartElement(const platform::XMLName& name,
                                       const platform::XMLAttributes& attributes) {
  events.append("<").append(name.qualified);
  if (const auto value = attributes.value("a")) events.append(" a=").append(*value);
  events.append(">");
  if (duringStart) duringStart();
}

void XMLEventRecorder::didEndElement(const platform::XMLName& name) {
  events.append("</").append(name.qualified).append(">");
  if (duringEnd) duringEnd();
}

void XMLEventRecorder::foundCharacters(std::string_view text) {
  events.append(text);
  if (duringCharacters) duringCharacters();
}

std::string eventsOf(std::string_view document) {
  XMLEventRecorder recorder;
  std::optional<platform::XMLFault> fault;
  if (platform::XMLParser(std::string(document), recorder).parse(fault)) {
    return fault ? "left a fault" : recorder.events;
  }
  return fault ? fault->record().description : "gave no fault";
}

std::string repeated(std::string_view text, std::size_t count) {
  std::string result;
  for (std::size_t copy = 0; copy < count; ++copy) result += text;
  return result;
}
