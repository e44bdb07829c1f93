#include <algorithm>
#include <cstddef>
#include <filesystem>
#include <iostream>
#include <span>
#include <string>
#include <system_error>
#include <vector>

#include "fuzz/FuzzTarget.h"
#include "tests/support/TemporaryDirectory.h"

/// Runs the target once with each file of the folders that are named, in place of the fuzzer: so
/// any compiler's build holds on to what was found once. A folder that is missing holds nothing.
int main(int argumentCount, char** arguments) {
  std::vector<std::filesystem::path> inputs;
  for (const char* folder :
       std::span(arguments, static_cast<std::size_t>(argumentCount)).subspan(1)) {
    std::error_code missing;
    for (const auto& entry : std::filesystem::directory_iterator(folder, missing)) {
      inputs.push_back(entry.path());
    }
  }
  std::sort(inputs.begin(), inputs.end());
  for (const std::filesystem::path& input : inputs) {
    // Told before, and at once: the last one told is the one that broke something.
    std::cout << input.string() << std::endl;
    const std::string bytes = contentOf(input.string());
    LLVMFuzzerTestOneInput(reinterpret_cast<const std::uint8_t*>(bytes.data()), bytes.size());
  }
  std::cout << inputs.size() << " inputs replayed" << std::endl;
  return inputs.empty() ? 1 : 0;
}
