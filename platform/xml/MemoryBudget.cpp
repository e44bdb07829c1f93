#include "platform/xml/MemoryBudget.h"

#include "platform/xml/XMLEscaping.h"

namespace platform {

bool MemoryBudget::takeWritten(std::string_view text) {
  // Room for a feed is made for texts as they are, so that one that is much longer when it is
  // escaped stands in memory twice while it is written.
  constexpr std::uint64_t kTimesWritten = 2;
  return take(kTimesWritten * (text.size() + 2 * std::uint64_t{sizeOfReferences(text)}));
}

}  // namespace platform
