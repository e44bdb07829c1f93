#pragma once

#include <concepts>
#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace platform {

/// An immutable UTF-8 text whose copies share one allocation.
///
/// The texts of a podcast pass from the parser to a record to an output dictionary, and are often
/// megabytes long; a copy of a Text is a copy of a handle. Since the characters never change, a
/// Text that was handed out stays valid and unchanged whatever its source does later, on any
/// thread.
///
///     const Text title("The Long Way Round");  // copies the characters, once
///     const Text same = title;                 // copies no character
///     const Text key = "PodcastName"_text;     // a literal's characters are never copied
///     if (title == "The Long Way Round") takesAView(title);  // a Text converts to string_view
class Text {
 public:
  /// The empty text.
  Text() = default;
  /// Leaves the empty text behind.
  Text(Text&& other) noexcept
      : bytes_(std::move(other.bytes_)), size_(std::exchange(other.size_, 0)) {}
  Text& operator=(Text&& other) noexcept {
    bytes_ = std::move(other.bytes_);
    size_ = std::exchange(other.size_, 0);
    return *this;
  }
  Text(const Text&) = default;
  Text& operator=(const Text&) = default;
  ~Text() = default;
  Text(std::string_view value) : bytes_(copied(value)), size_(value.size()) {}
  Text(const std::string& value) : Text(std::string_view(value)) {}
  Text(const char* value) : Text(std::string_view(value)) {}

  std::string_view view() const { return {bytes_.get(), size_}; }
  /// A copy of the characters, for callers that go on to change them.
  std::string string() const { return std::string(view()); }
  operator std::string_view() const { return view(); }

  bool empty() const { return size_ == 0; }
  /// The length in bytes.
  std::size_t size() const { return size_; }

  /// Whether the characters are those of the other text, of whatever type.
  template <std::convertible_to<std::string_view> Other>
  friend bool operator==(const Text& left, const Other& right) {
    return left.view() == std::string_view(right);
  }

 private:
  friend Text operator""_text(const char* bytes, std::size_t size);

  // NOLINTBEGIN(modernize-avoid-c-arrays): of a length that only the run knows
  /// Counter and characters in one allocation: a podcast has hundreds of thousands of texts.
  static std::shared_ptr<const char[]> copied(std::string_view value) {
    if (value.empty()) return nullptr;
    auto bytes = std::make_shared_for_overwrite<char[]>(value.size());
    value.copy(bytes.get(), value.size());
    return bytes;
  }

  std::shared_ptr<const char[]> bytes_;  // null for the empty text
  std::size_t size_ = 0;
  // NOLINTEND(modernize-avoid-c-arrays)
};

/// A text that may be absent, which is not the same as empty.
using OptionalText = std::optional<Text>;

/// The text of a literal ("title"_text): nothing is copied or counted, since literals last.
inline Text operator""_text(const char* bytes, std::size_t size) {
  Text text;
  text.bytes_ = decltype(text.bytes_)(decltype(text.bytes_)(), bytes);
  text.size_ = size;
  return text;
}

}  // namespace platform
