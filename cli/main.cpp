#include "cli/QELDriver.h"
#include "cli/common/QELMain.h"

int main(int argc, char** argv) {
  return QELMain(argc, argv, &QELRun);
}
