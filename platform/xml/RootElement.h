#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace platform {

/// The qualified name of the first element of a document of which these are the first bytes;
/// absent when they do not reach so far, or are no XML.
std::optional<std::string> rootElementName(std::string_view head);

}  // namespace platform
