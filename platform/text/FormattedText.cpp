#include "platform/text/FormattedText.h"

#include <algorithm>
#include <array>
#include <charconv>

#include "platform/text/Characters.h"

namespace platform {
namespace {

/// The digits of the largest double before its point, and room for the sign, the point and one
/// more.
constexpr std::size_t kLongestNumber = 320;

/// std::to_chars writes what printf writes in the C locale, whatever the locale of the process.
template <typename... Number>
void appendNumber(std::string& result, Number... numberAndFormat) {
  std::array<char, kLongestNumber> characters;
  const char* end =
      std::to_chars(characters.data(), characters.data() + characters.size(), numberAndFormat...)
          .ptr;
  result.append(static_cast<const char*>(characters.data()), end);
}

void append(std::string& result, const FormatArgument& argument, ControlCharacters controls) {
  const auto& value = argument.value;
  if (const auto* text = std::get_if<std::optional<std::string_view>>(&value)) {
    const std::string_view inserted = text->value_or("(null)");
    if (controls == ControlCharacters::kStay) {
      result.append(inserted);
    } else {
      result.append(withoutControls(inserted));
    }
  } else if (const auto* number = std::get_if<std::int64_t>(&value)) {
    appendNumber(result, *number);
  } else if (const auto* size = std::get_if<std::uint64_t>(&value)) {
    appendNumber(result, *size);
  } else {
    appendNumber(result, std::get<double>(value), std::chars_format::fixed, 1);
  }
}

constexpr std::array<std::string_view, 5> kPlaceholders = {"%@", "%s", "%ld", "%lu", "%0.1f"};

}  // namespace

std::string formattedText(std::string_view format, std::initializer_list<FormatArgument> arguments,
                          ControlCharacters controls) {
  std::string result;
  const FormatArgument* argument = arguments.begin();
  for (std::size_t percent = format.find('%'); percent != std::string_view::npos;
       percent = format.find('%')) {
    result.append(format.substr(0, percent));
    format.remove_prefix(percent);
    const auto* placeholder =
        std::find_if(kPlaceholders.begin(), kPlaceholders.end(),
                     [&](std::string_view known) { return format.starts_with(known); });
    if (placeholder != kPlaceholders.end()) {
      append(result, argument == arguments.end() ? std::nullopt : *argument++, controls);
      format.remove_prefix(placeholder->size());
    } else {
      result.push_back('%');  // of "%%", or of something that is no placeholder and stays
      format.remove_prefix(format.starts_with("%%") ? 2 : 1);
    }
  }
  return result.append(format);
}

}  // namespace platform
