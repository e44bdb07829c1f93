// One file that is every program: the name by which it is called tells which.
#include <string_view>

#include "cli/QELDriver.h"
#include "cli/common/QELMain.h"
#include "companions/check/QELCheckDriver.h"
#include "companions/keep/QELKeepDriver.h"
#include "companions/publish/QELPublishDriver.h"
#include "platform/files/Paths.h"

int main(int argc, char** argv) {
  const std::string_view name = argc > 0 ? platform::lastPathComponent(argv[0]) : "";
  auto* const run = name == "qel-keep"      ? &QELRunKeep
                    : name == "qel-check"   ? &QELRunCheck
                    : name == "qel-publish" ? &QELRunPublish
                                            : &QELRun;
  return QELMain(argc, argv, run);
}
