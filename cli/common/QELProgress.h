#pragma once

#include <initializer_list>
#include <optional>
#include <string_view>

#include "platform/text/FormattedText.h"

/// Whether progress lines are printed. False at start; the driver alone sets it, once, before a
/// source is loaded. Like all progress it belongs to the main thread.
extern bool QELShouldReportProgress;  // NOLINT(cppcoreguidelines-avoid-non-const-global-variables)

/// Prints one progress message, already formatted, on standard output. See QELProgress.
void QELReportProgress(std::optional<std::string_view> tag, std::string_view format,
                       std::initializer_list<platform::FormatArgument> arguments);

/// Prints a progress line on standard output, when reporting is on. The format is that of
/// platform::formattedText; surplus arguments are ignored, and so are failures to print.
///
/// Where standard output is a terminal, control characters of inserted texts show as U+FFFD.
///
/// With a tag ("N" for a notice, "W" for a warning) it prints "[tag] message" and a line break.
/// Without one it draws a line in place: the message behind two spaces and no line break, over the
/// in-place message before it. Backspaces move the cursor back over the old message, counted in
/// 16-bit units of UTF-16; nothing erases what a shorter message leaves of it. A tagged line that
/// follows an in-place one begins on a line of its own.
template <typename... Arguments>
void QELProgress(std::optional<std::string_view> tag, std::string_view format,
                 const Arguments&... arguments) {
  if (QELShouldReportProgress) QELReportProgress(tag, format, {arguments...});
}
