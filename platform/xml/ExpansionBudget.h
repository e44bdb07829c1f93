#pragma once

#include <cstddef>
#include <string_view>

namespace platform {

/// What the declarations of a document may add to it, with its entities and its attributes by
/// default.
///
/// The library recurses once for each entity inside an entity, compares each attribute that is
/// declared with all of its element's, and goes through these at each such element. It bounds what
/// entities deliver only at a hundred times the document, and attributes by default not at all.
///
/// Each function that takes counts one part of the document; false when it is one too many.
class ExpansionBudget {
 public:
  /// The document has so many more bytes.
  void grow(std::size_t size) {
    elementsLeft_ += kElementsPerByte * size;
    textLeft_ += kTextPerByte * size;
  }

  /// An entity is declared. One that is a parameter or external is never resolved.
  bool takeEntity(bool isResolved, std::string_view value) {
    hasDeclarations_ = true;
    const bool nests = isResolved && value.find('&') != std::string_view::npos;
    return !nests || ++nestingEntities_ <= kNestingEntitiesLimit;
  }
  /// An attribute is declared.
  bool takeAttribute() {
    hasDeclarations_ = true;
    return ++attributes_ <= kAttributesLimit;
  }

  /// An element is delivered: its name and its attributes, a null-terminated array of texts.
  bool takeElement(std::string_view name, const char* const* attributes) {
    if (!hasDeclarations_) return true;
    std::size_t size = kSizeOfElement + name.size();
    for (const char* const* text = attributes; *text != nullptr; ++text) {
      size += std::string_view(*text).size() + 1;
    }
    return spend(size, elementsLeft_);
  }
  /// A text is delivered.
  bool takeText(std::size_t size) { return !hasDeclarations_ || spend(size, textLeft_); }

 private:
  static constexpr std::size_t kNestingEntitiesLimit = 1000;
  static constexpr std::size_t kAttributesLimit = 256;
  /// Bytes of elements. Without entities no document exceeds its share: the shortest element,
  /// "<a/>", counts for just three times its bytes.
  static constexpr std::size_t kElementsAllowance = std::size_t{1} << 20;
  static constexpr std::size_t kElementsPerByte = 3;
  static constexpr std::size_t kSizeOfElement = 11;
  /// Bytes of text, which costs far less to keep. A feed may have its notice on every item from an
  /// entity.
  static constexpr std::size_t kTextAllowance = std::size_t{4} << 20;
  static constexpr std::size_t kTextPerByte = 8;

  static bool spend(std::size_t size, std::size_t& left) {
    if (size > left) return false;
    left -= size;
    return true;
  }

  bool hasDeclarations_ = false;
  std::size_t nestingEntities_ = 0;
  std::size_t attributes_ = 0;
  std::size_t elementsLeft_ = kElementsAllowance;
  std::size_t textLeft_ = kTextAllowance;
};

}  // namespace platform
