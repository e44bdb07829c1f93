#include "cli/common/QELMain.h"

#include <algorithm>
#include <cstddef>

#include "platform/process/Process.h"

int QELMain(int argumentCount, char** arguments, int (*run)(std::span<const char* const>)) {
  platform::prepareProcess();
  const std::span<const char* const> all(arguments, static_cast<std::size_t>(argumentCount));
  return run(all.subspan(std::min(all.size(), std::size_t{1})));
}
