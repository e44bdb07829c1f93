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
struct FormatArgument {
  /// An absent text is inserted as "(null)".
  template <std::convertible_to<std::optional<std::string_view>> TextType>
  FormatArgument(const TextType& text) : value(std::optional<std::string_view>(text)) {}
  FormatArgument(std::signed_integral auto number) : value(std::int64_t{number}) {}
  FormatArgument(std::unsigned_integral auto number) : value(std::uint64_t{number}) {}
  FormatArgument(double number) : value(number) {}

  std::variant<std::optional<std::string_view>, std::int64_t, std::uint64_t, double> value;
};

/// What becomes of the control characters of inserted texts; see withoutControls.
enum class ControlCharacters { kStay, kAreReplaced };

/// The format with its placeholders replaced by the arguments in order, as printf does it: "%@" and
/// "%s" stand for a text, "%ld" and "%lu" for an integer, "%0.1f" for a floating-point number, of
/// which one decimal is written, and "%%" for a percent sign. How an argument is written is decided
/// by its own type. Surplus arguments are ignored; a placeholder without an argument inserts
/// "(null)".
///
///     formattedText("%@: \"%@\"", {"Unsupported", title});  // Unsupported: "Pilot"
///     formattedText("%lu / %lu (%0.1f%%)", {512U, 2048U, 25.0});  // 512 / 2048 (25.0%)
///     formattedText("<%@>", {OptionalText()});  // <(null)>
std::string formattedText(std::string_view format, std::initializer_list<FormatArgument> arguments,
                          ControlCharacters controls = ControlCharacters::kStay);

}  // namespace platform
