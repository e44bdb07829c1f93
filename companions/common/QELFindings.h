#pragma once

#include <compare>
#include <cstddef>
#include <initializer_list>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/text/FormattedText.h"
#include "platform/xml/TextPosition.h"

enum class QELSeverity {
  kError,    // it is refused, or cannot be fetched
  kWarning,  // it is taken for something else than was meant, or is not taken
  kNote,     // good to know; nothing has to be done
};

/// Where a finding belongs.
struct QELPlace {
  std::optional<platform::TextPosition> position = std::nullopt;
  std::string path = {};  // where there are no lines: of keys ("Episodes[2].EpisodeDate")
  std::string file = {};  // where it is not the one that is checked
};

/// The kind of a finding: the format of its message (see platform::formattedText), and what tells
/// such findings apart that are not alike for all that. The format outlives the findings.
struct QELFindingKind {
  QELFindingKind(const char* text) : format(text) {}
  QELFindingKind(std::string_view text, std::string of = {})
      : format(text), variant(std::move(of)) {}
  std::string_view format;
  std::string variant;
  friend auto operator<=>(const QELFindingKind&, const QELFindingKind&) = default;
};

/// What was found in one file or bundle, as compilers print it: "FILE:LINE:COLUMN: error: ...".
///
/// A finding that stands in thousands of places is told in a few of them, so that others can be
/// seen beside it.
class QELFindings {
 public:
  /// Of each kind so many findings are kept, and the others counted.
  QELFindings(std::string file, std::size_t mostOfAKind)
      : file_(std::move(file)), mostOfAKind_(mostOfAKind) {}

  void add(QELSeverity severity, const QELPlace& place, const QELFindingKind& kind,
           std::initializer_list<platform::FormatArgument> arguments = {});

  /// Prints them to standard output by their position, those without one last. Whether there is
  /// anything to look at, which notes are not.
  bool print();

 private:
  struct Finding {
    QELSeverity severity;
    QELPlace place;
    std::string message;
    const std::size_t* countOfKind;  // of the last one that is kept of a kind; else null
  };

  std::string line(const Finding& finding) const;

  std::string file_;
  std::size_t mostOfAKind_;
  std::vector<Finding> findings_;
  std::map<QELFindingKind, std::size_t> counts_;
};

/// A text as a finding shows it: in quotes, on one line, and not too much of it.
std::string QELQuoted(std::string_view text);

/// Numbers of things by their names, the most frequent ones first: `3 "title", 1 "link", and 5
/// others`.
std::string QELListed(const std::map<std::string, std::size_t>& counts);
