#include <algorithm>
#include <cstddef>
#include <span>

#include "cli/QELDriver.h"
#include "platform/files/Process.h"
#include "platform/files/StandardStreams.h"

int main(int argc, char** argv) {
  platform::prepareProcess();
  const std::span<const char* const> arguments(argv, static_cast<std::size_t>(argc));
  const int status = QELRun(arguments.subspan(std::min(arguments.size(), std::size_t{1})));
  platform::flushStandardOutput();
  return status;
}
