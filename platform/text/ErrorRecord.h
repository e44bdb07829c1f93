#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace platform {

/// What went wrong, as every failing operation hands it to its caller.
///
/// The domain says whose numbers the code counts in ("POSIX", "XML", "transfer", ...); the
/// description is UTF-8 without a full stop or a line break at its end, made to be shown to people.
struct ErrorRecord {
  std::string domain;
  std::int64_t code = 0;
  std::string description;

  friend bool operator==(const ErrorRecord&, const ErrorRecord&) = default;
};

/// The slot that a caller supplies for a failure. A failing operation may leave it empty where its
/// contract says so; a succeeding one leaves it as it was.
using ErrorSlot = std::optional<ErrorRecord>;

}  // namespace platform
