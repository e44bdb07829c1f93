#include "cli/common/QELMain.h"
#include "companions/publish/QELPublishDriver.h"

int main(int argc, char** argv) {
  return QELMain(argc, argv, &QELRunPublish);
}
