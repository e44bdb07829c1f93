#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>

#include "platform/xml/MemoryBudget.h"

namespace platform {

/// What a document may grow into that is compressed, or that declares entities or attributes by
/// default. Any other costs what it is, and nothing is counted.
///
/// The library recurses once for each entity inside an entity, compares each attribute that is
/// declared with all of its element's, and goes through these at each such element. It bounds what
/// entities deliver only at a hundred times the document, and attributes by default not at all.
///
/// Each function that takes counts one part of the document; false when it is one too many.
class ExpansionBudget {
 public:
  /// Of a document that was received in so many compressed bytes.
  explicit ExpansionBudget(std::optional<std::uint64_t> compressedSize)
      : isCompressed_(compressedSize.has_value()),
        isCounting_(isCompressed_),
        memory_(kAllowance + kPerCompressedByte * compressedSize.value_or(0)) {}

  /// Whether what is made of the document has to be counted.
  bool isCounting() const { return isCounting_; }
  bool isCompressed() const { return isCompressed_; }
  /// For what is made of it.
  MemoryBudget& memory() { return memory_; }

  /// The document has so many more bytes.
  void grow(std::size_t size) {
    if (!isCompressed_) memory_.give(kPerByte * size);
  }
  /// The document was made so much larger by its conversion to UTF-8.
  bool takeConversion(std::size_t growth) {
    return !isCompressed_ || memory_.take(kTimesHeld * growth);
  }

  /// An entity is declared. One that is a parameter or external is never resolved.
  bool takeEntity(bool isResolved, std::string_view value) {
    isCounting_ = true;
    const bool nests = isResolved && value.find('&') != std::string_view::npos;
    return !nests || ++nestingEntities_ <= kNestingEntitiesLimit;
  }
  /// An attribute is declared.
  bool takeAttribute() {
    isCounting_ = true;
    return ++attributes_ <= kAttributesLimit;
  }

  /// An element begins: its name and its attributes, a null-terminated array of texts.
  bool takeElement(std::string_view name, const char* const* attributes) {
    if (!isCounting_) return true;
    std::size_t size = kSizeOfElement + sizeOfOpenElement(name);
    for (const char* const* text = attributes; *text != nullptr; ++text) {
      size += std::string_view(*text).size() + 1;
    }
    return memory_.take(size);
  }
  /// It ends. Declarations stand before all elements, so it was counted when it began.
  void endElement(std::string_view name) {
    if (isCounting_) memory_.give(sizeOfOpenElement(name));
  }
  /// A text is delivered.
  bool takeText(std::size_t size) { return !isCounting_ || memory_.take(kTimesHeld * size); }

 private:
  static constexpr std::size_t kNestingEntitiesLimit = 1000;
  static constexpr std::size_t kAttributesLimit = 256;
  /// For documents that are small whatever they do.
  static constexpr std::uint64_t kAllowance = std::uint64_t{6} << 20;
  /// With what the parser takes for a document itself, it stays within 64 bytes for each of its
  /// bytes. Without entities no document exceeds its share: an empty item, "<item/>", counts for
  /// 232 bytes of 280.
  static constexpr std::uint64_t kPerByte = 40;
  /// A feed that is compressed to a thirtieth counts for half of it.
  static constexpr std::uint64_t kPerCompressedByte = 350;
  /// What an element costs that is over, mostly in time.
  static constexpr std::size_t kSizeOfElement = 16;
  /// A text stands in the receiver's buffer and is kept; a document stands in the library's buffer
  /// besides, for a moment.
  static constexpr std::size_t kTimesHeld = 2;

  /// The library's record, with the name as it is written and as it is delivered.
  static std::size_t sizeOfOpenElement(std::string_view name) {
    constexpr std::size_t kSizeOfRecord = 160;
    return kSizeOfRecord + 2 * name.size();
  }

  bool isCompressed_;
  bool isCounting_;
  std::size_t nestingEntities_ = 0;
  std::size_t attributes_ = 0;
  MemoryBudget memory_;
};

}  // namespace platform
