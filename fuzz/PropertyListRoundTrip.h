#pragma once

#include <string>
#include <string_view>

#include "platform/plist/PropertyListValue.h"

/// Whether writing the value takes so much that it is not worth a run of a fuzzer: objects that are
/// shared can make a large list of few bytes.
bool isTooLargeToWrite(const platform::PropertyListValue& value);

/// Equality, except that what is no number equals what is no number.
bool areSame(const platform::PropertyListValue& left, const platform::PropertyListValue& right);

/// The text without what XML cannot hold.
std::string xmlText(std::string_view text);

/// What the dictionary is once it was written and read: without real numbers, booleans and data,
/// the texts and keys without what XML cannot hold, the dates without their fraction of a second.
platform::Dictionary afterWriting(const platform::Dictionary& dictionary);

/// The dictionary written as a property list.
std::string written(const platform::Dictionary& dictionary);

/// Writes the dictionary, reads it back and gives what was read. Requires that the list is accepted
/// and holds what `afterWriting` says.
platform::Dictionary writtenAndReadBack(const platform::Dictionary& dictionary);
