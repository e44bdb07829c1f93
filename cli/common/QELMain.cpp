#include "cli/common/QELMain.h"

#include <algorithm>
#include <cstddef>

#include "platform/files/StandardStreams.h"
#include "platform/process/Process.h"

int QELMain(int argumentCount, char** arguments, int (*run)(std::span<const char* const>)) {
  platform::prepareProcess();
  const std::span<const char* const> all(arguments, static_cast<std::size_t>(argumentCount));
  const int status = run(all.subspan(std::min(all.size(), std::size_t{1})));
  platform::flushStandardOutput();
  return status;
}
