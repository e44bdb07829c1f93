#include "companions/check/QELCheckDriver.h"

#include "companions/common/QELCommandLine.h"

int QELRunCheck(std::span<const char* const> commandLine) {
  QELCommandLine arguments(
      "qel-check", "[OPTION]... PATH...",
      "Tells what is wrong with reference files, bundles and feeds, and where.", {});
  if (const auto status = arguments.parse(commandLine)) return *status;
  return kAllWell;
}
