#pragma once

#include <string>

#include "platform/plist/PropertyListValue.h"

/// The value as one short line for comparison in tests: {"a": [1, 2u, 0.5r, "text", true,
/// 2005-05-16T12:30:00.250, <00ff>]}. Integers that only an unsigned number holds end in u,
/// floating point in r, data are hexadecimal.
std::string dumped(const platform::PropertyListValue& value);
