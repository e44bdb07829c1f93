#include <algorithm>
#include <string>
#include <variant>

#include "fuzz/FuzzTarget.h"
#include "fuzz/PropertyListRoundTrip.h"
#include "platform/plist/PropertyListReader.h"
#include "platform/xml/XMLEscaping.h"

namespace {

/// Whether XML can hold all texts of the value.
bool holdsTextsOfXML(const platform::PropertyListValue& value) {
  if (const auto* text = std::get_if<platform::Text>(&value.storage())) {
    return platform::isXMLText(*text);
  }
  if (const auto* array = value.asArray()) {
    return std::all_of(array->begin(), array->end(), holdsTextsOfXML);
  }
  const platform::Dictionary* dictionary = value.asDictionary();
  if (dictionary == nullptr) return true;
  return std::all_of(dictionary->begin(), dictionary->end(), [](const auto& entry) {
    return platform::isXMLText(entry.first) && holdsTextsOfXML(entry.second);
  });
}

}  // namespace

/// Any bytes as a property list: they are refused with a cause, or can be written and read again.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  std::optional<platform::PropertyListFault> fault;
  const auto value = platform::readPropertyList(std::string(inputText(data, size)), fault);
  if (!value) {
    requireTold(fault);
    return 0;
  }
  requireThat(!fault, "a list that is accepted leaves the slot alone");
  requireThat(holdsTextsOfXML(*value), "XML can hold what it held");
  const platform::Dictionary* dictionary = value->asDictionary();
  if (dictionary == nullptr || isTooLargeToWrite(*value)) return 0;
  writtenAndReadBack(*dictionary);
  return 0;
}
