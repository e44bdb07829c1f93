#include "companions/common/QELFindings.h"

#include <algorithm>

#include "platform/files/StandardStreams.h"
#include "platform/text/ASCII.h"
#include "platform/text/Characters.h"

namespace {

std::string_view nameOf(QELSeverity severity) {
  if (severity == QELSeverity::kNote) return "note";
  return severity == QELSeverity::kError ? "error" : "warning";
}

/// In the order of the positions; what has none comes last.
bool isBefore(const QELPlace& left, const QELPlace& right) {
  if (!left.position || !right.position) return left.position && !right.position;
  return std::pair(left.position->line, left.position->column) <
         std::pair(right.position->line, right.position->column);
}

}  // namespace

void QELFindings::add(QELSeverity severity, const QELPlace& place, const QELFindingKind& kind,
                      std::initializer_list<platform::FormatArgument> arguments) {
  std::size_t& count = counts_[kind];
  if (++count > mostOfAKind_) return;
  findings_.push_back(
      {severity, place,
       platform::formattedText(kind.format, arguments, platform::controlsOfStandardOutput()),
       count == mostOfAKind_ ? &count : nullptr});
}

bool QELFindings::print() {
  std::stable_sort(findings_.begin(), findings_.end(),
                   [](const Finding& a, const Finding& b) { return isBefore(a.place, b.place); });
  for (const Finding& finding : findings_) platform::writeToStandardOutput(line(finding));
  return std::any_of(findings_.begin(), findings_.end(),
                     [](const Finding& f) { return f.severity != QELSeverity::kNote; });
}

std::string QELFindings::line(const Finding& finding) const {
  const QELPlace& place = finding.place;
  std::string text = platform::formattedText("%@", {place.file.empty() ? file_ : place.file},
                                             platform::controlsOfStandardOutput());
  if (place.position) {
    text.append(":").append(std::to_string(place.position->line));
    text.append(":").append(std::to_string(place.position->column));
  }
  text.append(": ").append(nameOf(finding.severity)).append(": ");
  if (!place.path.empty()) {
    text += platform::formattedText("%@: ", {place.path}, platform::controlsOfStandardOutput());
  }
  text += finding.message;
  if (finding.countOfKind && *finding.countOfKind > mostOfAKind_) {
    text += platform::formattedText(" (and %lu more like this; --all shows them)",
                                    {*finding.countOfKind - mostOfAKind_});
  }
  return text + "\n";
}

std::string QELQuoted(std::string_view text) {
  constexpr std::size_t kMostCharacters = 60;
  std::string shown = "\"";
  std::size_t count = 0;
  for (std::size_t position = 0; position < text.size();) {
    const std::size_t start = text.find_first_not_of(platform::kWhitespace, position);
    if (start == std::string_view::npos) break;
    const bool isApart = start > position && count > 0;
    if (count + (isApart ? 1 : 0) >= kMostCharacters) return shown + "...\"";
    if (isApart) shown += ' ';
    position = start;
    platform::nextCharacter(text, position);
    shown.append(text.substr(start, position - start));
    count += isApart ? 2 : 1;
  }
  return shown + "\"";
}

std::string QELListed(const std::map<std::string, std::size_t>& counts) {
  std::vector<std::pair<std::size_t, std::string>> byCount;
  byCount.reserve(counts.size());
  for (const auto& [name, count] : counts) byCount.emplace_back(count, name);
  std::stable_sort(byCount.begin(), byCount.end(),
                   [](const auto& left, const auto& right) { return left.first > right.first; });
  constexpr std::size_t kMostNames = 12;
  std::string text;
  for (std::size_t i = 0; i < byCount.size() && i < kMostNames; ++i) {
    if (i > 0) text += ", ";
    text += std::to_string(byCount[i].first) + " " + QELQuoted(byCount[i].second);
  }
  if (byCount.size() <= kMostNames) return text;
  return text + ", and " + std::to_string(byCount.size() - kMostNames) + " others";
}
