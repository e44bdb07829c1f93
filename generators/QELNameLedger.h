#pragma once

#include <cstdint>
#include <string>
#include <unordered_map>
#include <unordered_set>

/// The base names that one bundle has given out, so that no two episodes get the same.
///
/// Names are compared exactly, letter case included; extensions play no part.
class QELNameLedger {
 public:
  /// The name itself if it is free, else the first free one of "name-2", "name-3", and so on; it is
  /// then taken. The cost does not grow with the number of names taken.
  std::string reserve(const std::string& name);

 private:
  std::unordered_set<std::string> taken_;
  /// For a name asked for again, the number to try next: a name once taken stays so, hence no lower
  /// number can have become free.
  std::unordered_map<std::string, std::uint64_t> nextNumbers_;
};
