#include "companions/publish/QELPublishDriver.h"

#include "companions/common/QELCommandLine.h"

int QELRunPublish(std::span<const char* const> commandLine) {
  QELCommandLine arguments("qel-publish", "[OPTION]... SOURCE FEED",
                           "Writes the feed of a show as readers and podcast directories want it.",
                           {});
  if (const auto status = arguments.parse(commandLine)) return *status;
  return kAllWell;
}
