#include "cli/common/QELReferenceType.h"

#include "platform/text/Case.h"
#include "platform/text/Characters.h"

platform::OptionalText QELReferenceType(std::optional<std::string_view> location) {
  // Made once: every record shares them.
  static const platform::Text local(kReferenceTypeLocal);
  static const platform::Text remote(kReferenceTypeRemote);

  if (!location || location->empty()) return std::nullopt;
  // The prefixes have five characters at most, and to lower-case just these gives the same as to
  // lower-case all.
  const std::string start = platform::lowercased(platform::firstCharacters(*location, 5));
  return start.starts_with("http") || start.starts_with("file:") ? remote : local;
}

platform::OptionalText QELMIMEType(std::optional<std::string_view> /*location*/) {
  return std::nullopt;
}
