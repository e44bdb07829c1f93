#include "tests/faults/FaultPlan.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <system_error>

namespace {

struct NamedError {
  std::string_view name;
  int value;
};

constexpr std::array<NamedError, 16> kErrors = {{{"EACCES", EACCES},
                                                 {"EAGAIN", EAGAIN},
                                                 {"EEXIST", EEXIST},
                                                 {"EINTR", EINTR},
                                                 {"EINVAL", EINVAL},
                                                 {"EIO", EIO},
                                                 {"EMFILE", EMFILE},
                                                 {"ENOENT", ENOENT},
                                                 {"ENOLCK", ENOLCK},
                                                 {"ENOMEM", ENOMEM},
                                                 {"ENOSPC", ENOSPC},
                                                 {"ENOSYS", ENOSYS},
                                                 {"EPERM", EPERM},
                                                 {"EROFS", EROFS},
                                                 {"EWOULDBLOCK", EWOULDBLOCK},
                                                 {"EXDEV", EXDEV}}};

}  // namespace

int FaultPlan::errorNamed(std::string_view name) {
  const auto* found = std::find_if(kErrors.begin(), kErrors.end(),
                                   [&](const NamedError& error) { return error.name == name; });
  return found == kErrors.end() ? 0 : found->value;
}

std::string_view FaultPlan::nameOfError(int error) {
  if (error == kShort) return "short";
  const auto* found = std::find_if(kErrors.begin(), kErrors.end(),
                                   [&](const NamedError& known) { return known.value == error; });
  return found == kErrors.end() ? std::string_view() : found->name;
}

bool FaultPlan::parseRule(std::string_view text, Rule& rule) {
  const std::size_t at = text.find('@');
  const std::size_t equals = text.find('=');
  if (at == std::string_view::npos || equals == std::string_view::npos || equals < at ||
      at > rule.kind.size()) {
    return false;
  }
  rule.kindLength = text.copy(rule.kind.data(), at);
  std::string_view when = text.substr(at + 1, equals - at - 1);
  if (when.starts_with('/')) {
    rule.when = When::kEach;
    when.remove_prefix(1);
  } else if (when.ends_with('+')) {
    rule.when = When::kFrom;
    when.remove_suffix(1);
  }
  const char* const end = when.data() + when.size();
  const auto [last, failure] = std::from_chars(when.data(), end, rule.number);
  if (failure != std::errc() || last != end || rule.number == 0) return false;
  const std::string_view how = text.substr(equals + 1);
  rule.outcome = how == "short" ? kShort : errorNamed(how);
  return rule.outcome != kPass;
}

bool FaultPlan::parse(std::string_view text) {
  while (!text.empty()) {
    const std::string_view rule = text.substr(0, text.find(','));
    if (ruleCount_ == rules_.size() || !parseRule(rule, rules_[ruleCount_])) return false;
    ++ruleCount_;
    text.remove_prefix(std::min(text.size(), rule.size() + 1));
  }
  return true;
}

int FaultPlan::judge(std::string_view kind) {
  int outcome = kPass;
  for (std::size_t index = 0; index < ruleCount_; ++index) {
    Rule& rule = rules_[index];
    const std::string_view meant(rule.kind.data(), rule.kindLength);
    const bool isAny = meant == "any" && kind != "malloc" && kind != "getrandom";
    if (meant != kind && !isAny) continue;
    ++rule.count;
    const bool applies = rule.when == When::kOnce   ? rule.count == rule.number
                         : rule.when == When::kFrom ? rule.count >= rule.number
                                                    : rule.count % rule.number == 0;
    if (applies && outcome == kPass) outcome = rule.outcome;
  }
  return outcome;
}
