#include "generators/QELNameLedger.h"

#include "platform/text/FormattedText.h"

std::string QELNameLedger::reserve(const std::string& name) {
  if (taken_.insert(name).second) return name;

  constexpr std::uint64_t kFirstNumber = 2;
  std::uint64_t& number = nextNumbers_.try_emplace(name, kFirstNumber).first->second;
  for (;;) {
    std::string numbered = platform::formattedText("%@-%lu", {name, number});
    ++number;
    if (taken_.insert(numbered).second) return numbered;
  }
}
