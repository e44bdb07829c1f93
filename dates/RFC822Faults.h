#pragma once

#include <string_view>

/// What keeps a date of a feed from being one as RFC 822 has it, in English with a zone that is
/// known: "the month is not known"; empty when nothing does. The tool's reader is more lenient,
/// and may take it for another date then; other readers refuse it.
std::string_view RFC822Fault(std::string_view text);
