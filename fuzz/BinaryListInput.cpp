#include "fuzz/BinaryListInput.h"

#include <algorithm>
#include <cstddef>

#include "tests/support/BinaryPropertyList.h"

std::string binaryListOf(std::string_view input) {
  if (input.starts_with("bplist")) return std::string(input);
  BinaryPropertyList list;
  while (!input.empty()) {
    const auto size = static_cast<std::size_t>(static_cast<unsigned char>(input.front()));
    input.remove_prefix(1);
    list.addBytes(std::string(input.substr(0, size)));
    input.remove_prefix(std::min(size, input.size()));
  }
  return list.bytes(0);
}
