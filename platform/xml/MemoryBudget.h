#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

namespace platform {

/// What may be made of a document before it is refused for what it would grow into, in bytes of
/// memory.
///
/// A few bytes can stand for very much: compressed ones, references to an entity, attributes by
/// default, references to an object of a binary list. So whoever reads such a document counts what
/// becomes of it: each record, each text wherever it stands, and how long a text is once it is
/// written, references for its markup included.
///
/// Each function that takes is false, and takes nothing, when that is more than is left.
class MemoryBudget {
 public:
  explicit MemoryBudget(std::uint64_t left) : left_(left) {}

  void give(std::uint64_t memory) { left_ += memory; }
  bool take(std::uint64_t memory) {
    if (memory > left_) return false;
    left_ -= memory;
    return true;
  }

  /// Elements of a list: the values that are read, the records that they may become, and the
  /// entries that are written of these. There are no more of them than bytes.
  bool takeRecords(std::uint64_t count = 1) { return take(kSizeOfRecord * count); }
  /// Values of records, apart from the characters of a text, in each of these forms.
  bool takeFields(std::uint64_t count = 1) { return take(kSizeOfField * count); }
  /// The characters of a text in a feed, which holds the longest ones twice.
  bool takeWritten(std::string_view text);

 private:
  static constexpr std::uint64_t kSizeOfRecord = 208;
  static constexpr std::uint64_t kSizeOfField = 192;

  std::uint64_t left_;
};

}  // namespace platform
