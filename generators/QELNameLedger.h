#pragma once

#include <cstdint>
#include <map>
#include <set>
#include <string>

/// The base names that one bundle has given out, so that no two episodes get the same.
///
/// Names are compared exactly, letter case included; extensions play no part.
class QELNameLedger {
 public:
  /// The name itself if it is free, else the first free one of "name-2", "name-3", and so on; it is
  /// then taken. The cost hardly grows with the number of names taken.
  std::string reserve(const std::string& name);

 private:
  /// Sorted: names that all hash alike can be made, and would make a hash table slow.
  std::set<std::string> taken_;
  /// For a name asked for again, the number to try next: a name once taken stays so, hence no lower
  /// number can have become free.
  std::map<std::string, std::uint64_t> nextNumbers_;
};
