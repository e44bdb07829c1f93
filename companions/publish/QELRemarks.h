#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

/// What is worth telling about a show, each kind in one line, however many episodes it concerns:
///
///     no date: "First Light", "Gate at Dusk", "Rain on Glass" and 7 more
class QELRemarks {
 public:
  /// Something about the show as a whole.
  void add(std::string_view what) { of(what); }
  /// Something about one of its parts, which is named as it is to be read.
  void add(std::string_view what, std::string_view part);

  /// The lines, in the order in which their kinds were met first.
  std::vector<std::string> lines() const;

 private:
  struct Remark {
    std::string what;
    std::vector<std::string> parts;  // the first of them
    std::size_t count = 0;           // of all
  };
  Remark& of(std::string_view what);

  std::vector<Remark> remarks_;
};
