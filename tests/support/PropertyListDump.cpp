#include "tests/support/PropertyListDump.h"

#include <gtest/gtest.h>

#include <array>
#include <charconv>
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <string_view>
#include <utility>
#include <variant>

#include "platform/plist/PropertyListReader.h"

namespace {

using platform::PropertyListValue;

struct Dumper {
  std::string& output;

  void operator()(const platform::Text& text) const { quote(text); }
  void operator()(std::int64_t number) const { output += std::to_string(number); }
  void operator()(std::uint64_t number) const { output += std::to_string(number) + "u"; }
  void operator()(bool flag) const { output += flag ? "true" : "false"; }

  void operator()(double number) const {
    std::array<char, 32> digits{};
    const auto result = std::to_chars(digits.data(), digits.data() + digits.size(), number);
    output.append(digits.data(), result.ptr);
    output += 'r';
  }

  void operator()(platform::PointInTime date) const {
    const auto day = std::chrono::floor<std::chrono::days>(date);
    const std::chrono::year_month_day civil(day);
    const std::chrono::hh_mm_ss time(date - day);
    std::array<char, 64> text{};
    std::snprintf(text.data(), text.size(), "%04d-%02u-%02uT%02d:%02d:%02d.%03d",
                  static_cast<int>(civil.year()), static_cast<unsigned>(civil.month()),
                  static_cast<unsigned>(civil.day()), static_cast<int>(time.hours().count()),
                  static_cast<int>(time.minutes().count()),
                  static_cast<int>(time.seconds().count()),
                  static_cast<int>(time.subseconds().count()));
    output += text.data();
  }

  void operator()(const PropertyListValue::Data& data) const {
    output += '<';
    for (const char byte : data.bytes) {
      std::array<char, 3> text{};
      std::snprintf(text.data(), text.size(), "%02x", static_cast<unsigned char>(byte));
      output += text.data();
    }
    output += '>';
  }

  void operator()(const PropertyListValue::Array& array) const {
    const char* separator = "";
    output += '[';
    for (const PropertyListValue& value : array) {
      output += std::exchange(separator, ", ");
      std::visit(*this, value.storage());
    }
    output += ']';
  }

  void operator()(const platform::Dictionary& dictionary) const {
    const char* separator = "";
    output += '{';
    for (const auto& [key, value] : dictionary) {
      output += std::exchange(separator, ", ");
      quote(key);
      output += ": ";
      std::visit(*this, value.storage());
    }
    output += '}';
  }

  void quote(std::string_view text) const {
    output += '"';
    output += text;
    output += '"';
  }
};

}  // namespace

std::string dumped(const PropertyListValue& value) {
  std::string output;
  std::visit(Dumper{output}, value.storage());
  return output;
}

std::string readOutcome(std::string_view bytes) {
  std::optional<platform::PropertyListFault> fault;
  const auto value = platform::readPropertyList(std::string(bytes), fault);
  EXPECT_NE(value.has_value(), fault.has_value());
  if (value) return dumped(*value);
  if (!fault) return "neither a value nor a fault";
  if (fault->position) return fault->description + " at " + fault->position->text();
  if (fault->object) {
    return "object " + std::to_string(*fault->object) + ": " + fault->description;
  }
  return fault->description;
}

void expectOutcomes(const std::vector<PropertyListRow>& rows) {
  for (const PropertyListRow& row : rows) {
    EXPECT_EQ(readOutcome(row.bytes), row.outcome) << row.name;
  }
}
