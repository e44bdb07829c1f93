#pragma once

#include "platform/plist/PropertyListValue.h"

/// What the record of a reference dictionary is once it was written as a feed (without the moment
/// of writing) and read back.
///
/// A feed keeps less than a reference file, and its reader goes by positions; this says exactly
/// what:
///
///  - Texts are the same, but for characters that XML cannot hold. Absent stays absent, empty
///  empty.
///  - An advisory label becomes "Explicit" (from "explicit" and "yes", in any case) or "Clean"; any
///    other is lost.
///  - The podcast's location is lost. But where it holds "collection/uuid/", what follows is the
///    uuid, unless a "document/uuid/" is in it too.
///  - A local absolute location becomes a file URL, one of an unknown reference type is lost;
///    reference types become what the locations say. Media type and size go with the location.
///  - Sizes stop at the largest signed integer.
///  - Dates lose their fraction of a second; for distant ones nothing is said.
///  - An order is the number at the start of all the text since the last element whose text is
///  read:
///    its own digits, but behind them first what "orvane:summary" or "link" hold, where nothing
///    that is read stands between.
platform::Dictionary afterFeed(const platform::Dictionary& record);

/// Whether the dictionary has a date that a feed may not give back: one before the year 100, which
/// would be read as a year of two digits, or after 280,000, where the library that writes dates is
/// no longer exact.
bool holdsDistantDate(const platform::Dictionary& record);
