#include "fuzz/BinaryListInput.h"
#include "fuzz/FuzzTarget.h"
#include "fuzz/PropertyListRoundTrip.h"
#include "platform/plist/PropertyListReader.h"

/// Any bytes, or any objects, as a binary property list: it is refused with a cause, or can be
/// written in the XML form and then reads back as what XML can hold of it.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  std::optional<platform::PropertyListFault> fault;
  const auto value = platform::readPropertyList(binaryListOf(inputText(data, size)), fault);
  if (!value) {
    requireTold(fault);
    return 0;
  }
  requireThat(!fault, "a list that is accepted leaves the slot alone");
  const platform::Dictionary* dictionary = value->asDictionary();
  if (dictionary == nullptr || isTooLargeToWrite(*value)) return 0;
  const platform::Dictionary once = writtenAndReadBack(*dictionary);
  requireThat(areSame(writtenAndReadBack(once), once), "XML can hold what it held");
  return 0;
}
