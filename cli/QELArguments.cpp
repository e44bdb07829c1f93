#include "cli/QELArguments.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <string_view>

namespace {

constexpr std::array<std::string_view, 3> kCommands = {"createbundle", "createfeed", "parsefeed"};

}  // namespace

QELArguments QELScanArguments(std::span<const char* const> arguments) {
  QELArguments scanned;
  std::size_t index = 0;
  const auto next = [&]() -> std::optional<std::string> {
    if (index == arguments.size()) return std::nullopt;
    return arguments[index++];
  };

  while (const std::optional<std::string> argument = next()) {
    if (argument->starts_with('-')) {
      const std::string_view option = std::string_view(*argument).substr(1, 1);
      if (option == "d") scanned.outputPath = next();
      if (option == "f") scanned.feedFormat = next();
      if (option == "i") scanned.readStandardInput = true;
    } else if (!scanned.command) {
      if (std::find(kCommands.begin(), kCommands.end(), *argument) == kCommands.end()) {
        scanned.unknownCommand = argument;
        return scanned;
      }
      scanned.command = argument;
    } else if (!scanned.source) {
      scanned.source = argument;
    }
  }
  return scanned;
}
