#include "cli/common/QELMain.h"
#include "companions/keep/QELKeepDriver.h"

int main(int argc, char** argv) {
  return QELMain(argc, argv, &QELRunKeep);
}
