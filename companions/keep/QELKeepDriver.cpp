#include "companions/keep/QELKeepDriver.h"

#include "companions/common/QELCommandLine.h"

int QELRunKeep(std::span<const char* const> commandLine) {
  QELCommandLine arguments(
      "qel-keep", "[OPTION]... [SOURCE] BUNDLE",
      "Keeps a show in a bundle: fetches what is new, and never loses what is there.", {});
  if (const auto status = arguments.parse(commandLine)) return *status;
  return kAllWell;
}
