#include "cli/QELArguments.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <string_view>

namespace {

constexpr std::array<std::string_view, 3> kCommands = {"createbundle", "createfeed", "parsefeed"};

bool isCommand(std::string_view word) {
  return std::find(kCommands.begin(), kCommands.end(), word) != kCommands.end();
}

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
      switch (argument->size() > 1 ? (*argument)[1] : '\0') {
        case 'd':
          scanned.outputPath = next();
          break;
        case 'f':
          scanned.feedFormat = next();
          break;
        case 'i':
          scanned.readStandardInput = true;
          break;
        default:
          break;
      }
    } else if (!scanned.command) {
      if (!isCommand(*argument)) {
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
