#include "cli/common/QELMain.h"
#include "companions/check/QELCheckDriver.h"

int main(int argc, char** argv) {
  return QELMain(argc, argv, &QELRunCheck);
}
