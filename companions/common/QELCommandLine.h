#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "cli/common/QELDirectory.h"

/// The exit statuses of the companions.
inline constexpr int kAllWell = 0;
inline constexpr int kSomethingToLookAt = 1;
/// Wrong use, or nothing could be done.
inline constexpr int kNothingDone = 2;

/// One option of a companion.
struct QELOption {
  std::string name;       // without its hyphens
  char letter = '\0';     // of its short form
  std::string valueName;  // "N" in "--jobs N"; empty for an option without a value
  std::string help;       // one line of what it does
  /// Takes the value (empty for an option without one). False when it is no such value.
  std::function<bool(const std::string& value)> take;
};

/// The command line of a companion: its options, "--help" and "--version", and its messages.
///
///     QELCommandLine commandLine("qel-keep", "[OPTION]... [SOURCE] BUNDLE", "Keeps a show.",
///                                {{"quiet", 'q', "", "print nothing but failures", takeQuiet}});
///     if (const auto status = commandLine.parse(arguments)) return *status;
///     if (commandLine.operands().empty()) return commandLine.wrongUse("BUNDLE is missing");
class QELCommandLine {
 public:
  /// The usage is what follows the name in it; the summary is a sentence or a few, each line below
  /// 80 characters.
  QELCommandLine(std::string name, std::string usage, std::string summary,
                 std::vector<QELOption> options);

  /// Hands each option to its `take`, in the order given; the last word of several is theirs. An
  /// exit status when the run is over: after "--help" or "--version", which are printed to standard
  /// output, and after wrong use, which was reported.
  std::optional<int> parse(std::span<const char* const> arguments);

  /// The words that are no options.
  const std::vector<std::string>& operands() const { return operands_; }

  /// Prints "NAME: MESSAGE" on standard error.
  void report(std::string_view message) const;
  /// Reports the wrong use, with a hint at "--help", and gives its exit status.
  int wrongUse(std::string_view message) const;
  /// Flushes standard output. Returns the status; at least kSomethingToLookAt, after a message,
  /// when not all that was printed was taken.
  int finish(int status) const;

 private:
  std::string help() const;

  std::string name_;
  std::string usage_;
  std::string summary_;
  std::vector<QELOption> options_;
  std::vector<std::string> operands_;
};

/// A `take` that stores true, and one that stores a whole number of at least `least`.
std::function<bool(const std::string&)> QELTakeFlag(bool& flag);
std::function<bool(const std::string&)> QELTakeNumber(std::int64_t& number, std::int64_t least);
/// A `take` that stores a URL of http or https, percent-encoded where that was left out.
std::function<bool(const std::string&)> QELTakeURL(std::optional<std::string>& text);
/// A `take` that stores what looks like a language tag of RFC 5646: letters first, hyphens between
/// the parts.
std::function<bool(const std::string&)> QELTakeLanguage(std::optional<std::string>& tag);
/// A `take` that stores "NAME=URI": NAME is a prefix of XML that stands for nothing else in our
/// feeds, URI an absolute one.
std::function<bool(const std::string&)> QELTakeDirectory(QELDirectory& directory);
