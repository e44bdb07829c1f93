#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "platform/plist/PropertyListValue.h"

/// The value as one short line for comparison in tests: {"a": [1, 2u, 0.5r, "text", true,
/// 2005-05-16T12:30:00.250, <00ff>]}. Integers that only an unsigned number holds end in u,
/// floating point in r, data are hexadecimal.
std::string dumped(const platform::PropertyListValue& value);

/// What readPropertyList makes of the bytes: the value as one line, or the fault with its place,
/// "an empty property list", "object 7: an object that does not exist" or "mismatched tag at line
/// 3, column 7".
std::string readOutcome(std::string_view bytes);

/// A property list and its outcome.
struct PropertyListRow {
  const char* name;
  std::string bytes;
  std::string outcome;
};
void expectOutcomes(const std::vector<PropertyListRow>& rows);
