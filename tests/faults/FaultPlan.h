#pragma once

#include <array>
#include <cstddef>
#include <string_view>

/// Which calls of a run are to fail, and how.
///
/// A plan is a list of rules "KIND@WHEN=HOW", separated by commas. KIND is the name of a kind of
/// call, or "any" for all but "malloc" and "getrandom" (the C library ends a process that gets no
/// random bytes for a hash table). WHEN counts the calls of that kind from 1: "3" is the third,
/// "3+" the third and all later ones, "/3" every third. HOW is the name of an errno value, or
/// "short": the call then moves only a few of the bytes that it was asked to move.
///
/// It is asked inside of allocation functions and of a signal handler, so it neither allocates nor
/// calls the system.
class FaultPlan {
 public:
  static constexpr int kPass = 0;
  static constexpr int kShort = -1;

  /// False for a text that is no plan.
  bool parse(std::string_view text);

  /// Counts one call of the kind. The errno value with which it is to fail, or kPass or kShort.
  int judge(std::string_view kind);

  /// The errno value of the name; 0 when it is not known here.
  static int errorNamed(std::string_view name);
  static std::string_view nameOfError(int error);

 private:
  enum class When { kOnce, kFrom, kEach };
  struct Rule {
    std::array<char, 24> kind{};
    std::size_t kindLength = 0;
    When when = When::kOnce;
    unsigned long number = 0;
    int outcome = kPass;
    unsigned long count = 0;
  };

  static bool parseRule(std::string_view text, Rule& rule);

  std::array<Rule, 16> rules_{};
  std::size_t ruleCount_ = 0;
};
