#include "platform/process/SystemStart.h"

#include <fstream>

namespace platform {

std::string systemStart() {
  std::ifstream file("/proc/sys/kernel/random/boot_id");
  std::string line;
  std::getline(file, line);
  return line;
}

}  // namespace platform
