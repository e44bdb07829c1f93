#pragma once

#include <cstddef>
#include <memory>
#include <ostream>
#include <string>
#include <string_view>
#include <utility>

namespace platform {

/// An immutable UTF-8 text whose copies share one allocation.
///
/// The texts of a podcast pass from the parser to a record to an output dictionary, and are often
/// megabytes long; a copy of a Text is a copy of a handle. Since the characters never change, a
/// Text that was handed out stays valid and unchanged whatever its source does later, on any
/// thread. An absent text is a std::optional<Text> without a value, distinct from an empty Text.
class Text {
 public:
  /// The empty text.
  Text() = default;
  Text(std::string value)
      : value_(value.empty() ? nullptr : std::make_shared<const std::string>(std::move(value))) {}
  Text(std::string_view value) : Text(std::string(value)) {}
  Text(const char* value) : Text(std::string(value)) {}

  std::string_view view() const { return value_ ? std::string_view(*value_) : std::string_view(); }
  /// A copy of the characters, for callers that go on to change them.
  std::string string() const { return std::string(view()); }
  operator std::string_view() const { return view(); }

  bool empty() const { return !value_; }
  /// The length in bytes.
  std::size_t size() const { return view().size(); }

  friend bool operator==(const Text& left, const Text& right) {
    return left.value_ == right.value_ || left.view() == right.view();
  }
  friend bool operator==(const Text& left, std::string_view right) { return left.view() == right; }
  friend bool operator==(const Text& left, const char* right) { return left.view() == right; }
  friend bool operator==(const Text& left, const std::string& right) {
    return left.view() == right;
  }
  friend std::ostream& operator<<(std::ostream& stream, const Text& text) {
    return stream << text.view();
  }

 private:
  std::shared_ptr<const std::string> value_;  // null for the empty text
};

}  // namespace platform
