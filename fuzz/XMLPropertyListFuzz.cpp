#include <string>

#include "fuzz/FuzzTarget.h"
#include "fuzz/PropertyListRoundTrip.h"
#include "platform/plist/PropertyListReader.h"

/// Any bytes as a property list: they are refused with a cause, or can be written and read again.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  platform::ErrorSlot error;
  const auto value = platform::readPropertyList(std::string(inputText(data, size)), error);
  if (!value) {
    requireTold(error);
    return 0;
  }
  requireThat(!error, "a list that is accepted leaves the slot alone");
  const platform::Dictionary* dictionary = value->asDictionary();
  if (dictionary == nullptr || isTooLargeToWrite(*value)) return 0;
  // XML held it once, so nothing at all gets lost.
  requireThat(areSame(writtenAndReadBack(*dictionary), *dictionary), "XML can hold what it held");
  return 0;
}
