#include "platform/xml/MemoryBudget.h"

#include "platform/xml/XMLEscaping.h"

namespace platform {

bool MemoryBudget::takeWritten(std::string_view text) {
  // A feed holds authors and descriptions twice, and may hold three bytes for one of a path.
  constexpr std::uint64_t kTimesWritten = 2;
  return take(kTimesWritten * (text.size() + 2 * std::uint64_t{sizeOfReferences(text)}));
}

}  // namespace platform
