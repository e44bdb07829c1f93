#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace platform {

/// An option of a command line: "--name", or "-l" where it has a letter.
struct CommandOption {
  std::string name;
  char letter = '\0';
  bool takesValue = false;
};

/// A command line, taken apart.
struct CommandWords {
  struct Option {
    std::size_t index;  // among the options that are known
    std::string value;  // empty for one that takes none
  };
  std::vector<Option> options;        // in the order in which they were given
  std::vector<std::string> operands;  // everything else
  /// What is wrong with it, without a line break ("unrecognized option '--x'"); absent when nothing
  /// is. The rest is not to be used then.
  std::optional<std::string> fault;
};

/// Takes the arguments apart (without the program's name) as getopt_long of the GNU C library does:
/// options and operands in any order, "--" ends the options, "-" is an operand, a name may be cut
/// as long as it is no other's beginning, too, and a value follows behind "=" or as the next word.
CommandWords parseCommandWords(std::span<const char* const> arguments,
                               std::span<const CommandOption> options);

}  // namespace platform
