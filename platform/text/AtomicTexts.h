#pragma once

#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <utility>

#include "platform/text/AtomicValue.h"
#include "platform/text/Text.h"

namespace platform {

/// A fixed number of texts that may be absent, each with the promises of an AtomicValue.
///
/// Only the texts that are present take memory: a podcast may have millions of records with next to
/// nothing in them. So a text that appears or goes away moves the others; whoever has all of them
/// stores them together.
template <std::size_t Count>
class AtomicTexts {
 public:
  using All = std::array<OptionalText, Count>;

  OptionalText load(std::size_t index) const {
    return held_.use([index](const Present& present) -> OptionalText {
      if (!present.has(index)) return std::nullopt;
      return present.text(index);
    });
  }

  void store(std::size_t index, OptionalText text) {
    // The old text is left in `text` and destroyed after the lock is released.
    held_.use([index, &text](Present& present) {
      if (present.has(index) != text.has_value()) {
        All all = present.takeAll();
        std::swap(all[index], text);
        present = Present(all);
      } else if (text) {
        std::swap(present.text(index), *text);
      }
    });
  }

  void storeAll(All texts) {
    Present present(texts);
    held_.use([&present](Present& held) { std::swap(held, present); });
  }

 private:
  using Mask = std::uint16_t;
  static_assert(Count <= sizeof(Mask) * 8);

  /// The texts that are present, side by side in the order of their indices.
  class Present {
   public:
    Present() = default;
    /// Moves the texts.
    explicit Present(All& all) {
      for (std::size_t index = 0; index < Count; ++index) {
        if (all[index]) mask_ = static_cast<Mask>(mask_ | bit(index));
      }
      if (mask_ == 0) return;
      // NOLINTNEXTLINE(modernize-avoid-c-arrays)
      texts_ = std::make_unique<Text[]>(static_cast<std::size_t>(std::popcount(mask_)));
      Text* next = texts_.get();
      for (OptionalText& text : all) {
        if (text) *next++ = std::move(*text);
      }
    }

    bool has(std::size_t index) const { return (mask_ & bit(index)) != 0; }
    Text& text(std::size_t index) const {
      const auto before = static_cast<Mask>(mask_ & (bit(index) - 1U));
      return texts_[static_cast<std::size_t>(std::popcount(before))];
    }

    All takeAll() {
      All all;
      for (std::size_t index = 0; index < Count; ++index) {
        if (has(index)) all[index] = std::move(text(index));
      }
      return all;
    }

   private:
    static constexpr unsigned bit(std::size_t index) { return 1U << index; }

    // NOLINTNEXTLINE(modernize-avoid-c-arrays): of a length that only the run knows
    std::unique_ptr<Text[]> texts_;
    Mask mask_ = 0;  // by index: whether the text is present
  };

  AtomicValue<Present> held_;
};

}  // namespace platform
