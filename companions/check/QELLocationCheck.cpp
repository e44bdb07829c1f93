#include "companions/check/QELLocationCheck.h"

#include "cli/common/QELReferenceType.h"
#include "platform/net/URLFault.h"

void QELCheckLocation(const QELReferenceRecord& record, std::string_view key,
                      QELFindings& findings) {
  const auto warn = [&](const platform::PropertyListPart& part, std::string_view format,
                        std::initializer_list<platform::FormatArgument> arguments) {
    findings.add(QELSeverity::kWarning, QELPlaceOf(part), format, arguments);
  };
  const std::string typeKey = std::string(key) + "Type";
  const platform::PropertyListPart* const type = record.value(typeKey);
  if (type && type->text() != kReferenceTypeLocal && type->text() != kReferenceTypeRemote) {
    return warn(*type, "\"%@\" must be \"local\" or \"remote\", not %@: write one, or leave it out",
                {typeKey, QELQuoted(type->text())});
  }
  const platform::PropertyListPart* const location = record.value(key);
  if (!location) {
    if (type && !record.has(key)) {
      warn(*type, "\"%@\" stands here without \"%@\": add that, or leave this out", {typeKey, key});
    }
    return;
  }
  const std::string_view text = location->text();
  const std::string shown = QELQuoted(text);
  const bool looksLikeURL = platform::looksLikeURL(text);
  const bool isDerived = type == nullptr && key.starts_with("Episode");
  const bool isRemote = type != nullptr
                            ? type->text() == kReferenceTypeRemote
                            : isDerived && QELReferenceType(text) == kReferenceTypeRemote;
  std::string_view message;  // of the location and, where it needs it, of its type's key
  if (text.empty()) {
    return warn(*location, "\"%@\" is empty: write a path or a URL, or leave it out", {key});
  }
  if (isRemote && looksLikeURL) {
    const std::string fault = platform::urlFault(text);
    if (fault.empty()) return;
    return findings.add(QELSeverity::kError, QELPlaceOf(*location),
                        "%@ is no URL that qel can fetch: %@", {shown, fault});
  }
  if (isRemote && type) {
    message = "%@ is a path, but its type is \"remote\", so it is taken for a URL: write \"local\"";
  } else if (isRemote) {
    message = "%@ begins like a URL and is taken for one: give it the \"%@\" \"local\"";
  } else if (looksLikeURL && type) {
    message = "%@ is a URL, but its type is \"local\", so it is taken for a path: write \"remote\"";
  } else if (looksLikeURL && !platform::hasFetchedScheme(text)) {
    message = "%@ is taken for a path: only http:, https: and file: URLs are fetched";
  } else if (looksLikeURL && key != "PodcastReference") {
    message = "%@ is a URL, but has no \"%@\" of \"remote\", so it is taken for a path: add that";
  } else if (text.starts_with("~/")) {
    message = "%@ does not begin in a home directory, since \"~\" is a name: write the whole path";
  } else {
    return;
  }
  warn(*location, message, {shown, typeKey});
}
