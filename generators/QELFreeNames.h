#pragma once

#include <cstdint>
#include <map>
#include <set>
#include <string>
#include <string_view>

/// The names of one directory, and new ones for files that are to be added, which are free and that
/// every file system can have.
///
///     QELFreeNames names;
///     names.take("Show.mp3");         // lies there
///     names.reserve("show", "mp3");   // "show-2.mp3"
///     names.reserve("show", "mp3");   // "show-3.mp3"
///     names.reserve("con:a", "mp3");  // "con_a.mp3"
class QELFreeNames {
 public:
  /// Notes a name that is not free, whatever case it is asked for in.
  void take(std::string_view name);
  /// Notes the names of all that lies in the directory, if there is one.
  void takeAllOf(const std::string& path);

  /// "BASE.EXTENSION", or the first free one of "BASE-2.EXTENSION" and so on; it is then taken.
  /// Characters and names that some system reserves are changed, an empty base is "episode", an
  /// empty extension leaves the dot out, and a base that is too long is cut.
  std::string reserve(std::string_view base, std::string_view extension);

 private:
  std::set<std::string> taken_;  // case folded
  /// For a name asked for again, case folded, the number to try next.
  std::map<std::string, std::uint64_t> nextNumbers_;
};
