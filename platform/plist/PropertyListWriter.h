#pragma once

#include "platform/plist/PropertyListValue.h"
#include "platform/text/ByteSink.h"

namespace platform {

/// Writes the dictionary as an XML property list: UTF-8, the DTD "PropertyList 1.0", one tab for
/// each level, keys in sorted order (bytewise), so that equal dictionaries give equal bytes.
///
/// Texts, integers, dates, arrays and dictionaries are written, which is all that a podcast has; a
/// real number, a boolean and data are left out, in a dictionary with their key. Characters that
/// XML 1.0 cannot hold are left out; a date loses its fraction of a second (towards the past). The
/// bytes go to the sink in large pieces. False when the sink refused some.
bool writePropertyList(const Dictionary& dictionary, const ByteSink& sink);

}  // namespace platform
