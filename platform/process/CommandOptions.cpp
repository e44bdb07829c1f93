#include "platform/process/CommandOptions.h"

#include <getopt.h>

#include <algorithm>

namespace platform {
namespace {

/// What getopt_long answers for a known option; others are characters of its own.
constexpr int kFirstOption = 256;

/// The rule that was broken, as the library left it in its variables. `word` is the one that it
/// looked at last.
std::string faultOf(int answer, std::string_view word, std::span<const CommandOption> options) {
  const bool isLetter = optopt > 0 && optopt < kFirstOption;
  const std::string name = isLetter ? std::string("-") + static_cast<char>(optopt)
                                    : std::string(word.substr(0, word.find('=')));
  if (answer == ':') return "option '" + name + "' requires a value";
  if (optopt >= kFirstOption) return "option '" + name + "' takes no value";
  const auto couldBeMeant = [&name](const CommandOption& option) {
    return ("--" + option.name).starts_with(name);
  };
  const bool isBeginning = !isLetter && std::any_of(options.begin(), options.end(), couldBeMeant);
  return (isBeginning ? "ambiguous option '" : "unrecognized option '") + name + "'";
}

}  // namespace

CommandWords parseCommandWords(std::span<const char* const> arguments,
                               std::span<const CommandOption> options) {
  std::string letters = ":";  // a missing value is told apart, and nothing is printed
  std::vector<::option> names;
  for (std::size_t index = 0; index < options.size(); ++index) {
    const CommandOption& option = options[index];
    const int hasValue = option.takesValue ? required_argument : no_argument;
    names.push_back(
        {option.name.c_str(), hasValue, nullptr, kFirstOption + static_cast<int>(index)});
    if (option.letter == '\0') continue;
    letters += option.letter;
    if (option.takesValue) letters += ':';
  }
  names.push_back({});

  // They are put in another order, operands last; the words themselves stay as they are.
  std::vector<char*> words = {const_cast<char*>("")};
  for (const char* argument : arguments) words.push_back(const_cast<char*>(argument));
  const int count = static_cast<int>(words.size());
  words.push_back(nullptr);

  CommandWords result;
  optind = 0;  // which makes the GNU C library begin anew
  opterr = 0;
  for (;;) {
    const int answer = ::getopt_long(count, words.data(), letters.c_str(), names.data(), nullptr);
    if (answer == -1) break;
    if (answer == '?' || answer == ':') {
      result.fault = faultOf(answer, words[static_cast<std::size_t>(optind - 1)], options);
      return result;
    }
    std::size_t index = 0;
    if (answer >= kFirstOption) {
      index = static_cast<std::size_t>(answer - kFirstOption);
    } else {
      while (options[index].letter != answer) ++index;
    }
    result.options.push_back({index, optarg != nullptr ? optarg : ""});
  }
  for (int index = optind; index < count; ++index) {
    result.operands.emplace_back(words[static_cast<std::size_t>(index)]);
  }
  return result;
}

}  // namespace platform
