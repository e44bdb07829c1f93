#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "platform/xml/TextPosition.h"

namespace platform {

/// The encoding that the first bytes of an XML document tell.
///
/// A byte order mark decides; without one, the zeros of UTF-16 and UTF-32 show; where neither does,
/// the XML declaration can be read, and names it. A document that tells nothing is UTF-8, or, if it
/// is no valid UTF-8, in the encoding that came beside it.
struct DocumentEncoding {
  /// By its canonical name. Absent when the document names one that is not known.
  std::optional<std::string> name;
  /// The bytes of the byte order mark.
  std::size_t markLength = 0;
  /// The name as the declaration writes it, and where; empty where no name decided.
  std::string label = {};
  TextPosition position = {};

  /// White space may stand before the declaration. One that claims ISO-8859-1 or US-ASCII gives
  /// windows-1252, which is what such documents mean; one that claims UTF-16 or UTF-32, and can be
  /// read byte by byte all the same, gives UTF-8.
  ///
  /// `hint` is the name that came beside the bytes, which must be all of them then; one that is not
  /// known counts as none.
  static DocumentEncoding of(std::string_view bytes, std::string_view hint = {});
};

}  // namespace platform
