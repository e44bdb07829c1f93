#pragma once

#include <functional>
#include <string_view>

namespace platform {

/// Takes the next bytes of an output; false once they could not be taken, after which a writer
/// stops.
using ByteSink = std::function<bool(std::string_view)>;

}  // namespace platform
