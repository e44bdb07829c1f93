#pragma once

#include <string>
#include <string_view>

namespace platform {

/// The text in lower (upper) case by Unicode's full, locale-independent case mapping. Bytes that
/// are no UTF-8 stay as they are.
std::string lowercased(std::string_view text);
std::string uppercased(std::string_view text);

/// The text by Unicode's full case folding, which is the same for texts that differ in case alone
/// ("STRASSE" and "straße"). Bytes that are no UTF-8 stay as they are.
std::string caseFolded(std::string_view text);

}  // namespace platform
