#pragma once

#include <optional>
#include <span>
#include <string>

/// What the command line asks for.
struct QELArguments {
  std::optional<std::string> command;
  std::optional<std::string> unknownCommand;  // where a command was expected
  std::optional<std::string> source;
  std::optional<std::string> outputPath;  // -d
  std::optional<std::string> feedFormat;  // -f
  bool readStandardInput = false;         // -i
};

/// Scans the arguments (without the program's name), in any order: the first that does not begin
/// with a hyphen is the command, the second the source, the others are ignored. Of an option only
/// the second character counts; "d" and "f" take the next argument whatever it looks like, and the
/// last one given wins; an unknown option is ignored. A "-d" or "-f" with nothing behind it leaves
/// its value absent. An unknown command ends the scan at once.
QELArguments QELScanArguments(std::span<const char* const> arguments);
