#pragma once

#include <concepts>
#include <cstdint>
#include <initializer_list>
#include <optional>
#include <string>
#include <string_view>
#include <variant>

namespace platform {

/// One value for a placeholder of `formattedText`.
class FormatArgument {
 public:
  template <typename TextType>
  requires std::convertible_to<const TextType&, std::string_view> FormatArgument(
      const TextType& text)
      : value_(std::optional<std::string_view>(std::string_view(text))) {}
  /// An absent text is inserted as "(null)".
  template <typename TextType>
  requires std::convertible_to<const TextType&, std::string_view> FormatArgument(
      const std::optional<TextType>& text)
      : value_(text ? std::optional<std::string_view>(std::string_view(*text)) : std::nullopt) {}
  FormatArgument(std::signed_integral auto number) : value_(std::int64_t{number}) {}
  FormatArgument(std::unsigned_integral auto number) : value_(std::uint64_t{number}) {}
  FormatArgument(double number) : value_(number) {}

  using Value = std::variant<std::optional<std::string_view>, std::int64_t, std::uint64_t, double>;
  const Value& value() const { return value_; }

 private:
  Value value_;
};

/// The format with its placeholders replaced by the arguments in order, as printf does it: "%@" and
/// "%s" stand for a text, "%ld" and "%lu" for an integer, "%0.1f" for a floating-point number, of
/// which one decimal is written, and "%%" for a percent sign. How an argument is written is decided
/// by its own type. Surplus arguments are ignored; a placeholder without an argument inserts
/// "(null)".
///
///     formattedText("%@: \"%@\"", {"Unsupported", title});  // Unsupported: "Pilot"
///     formattedText("%lu / %lu (%0.1f%%)", {512U, 2048U, 25.0});  // 512 / 2048 (25.0%)
///     formattedText("<%@>", {OptionalText()});  // <(null)>
std::string formattedText(std::string_view format, std::initializer_list<FormatArgument> arguments);

}  // namespace platform
