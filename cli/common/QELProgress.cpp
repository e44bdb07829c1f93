#include "cli/common/QELProgress.h"

#include <string>

#include "platform/files/StandardStreams.h"
#include "platform/text/Characters.h"

bool QELShouldReportProgress = false;

void QELReportProgress(std::optional<std::string_view> tag, std::string_view format,
                       std::initializer_list<platform::FormatArgument> arguments) {
  // The in-place message that is on screen now, for the next one to be drawn over it.
  static std::optional<std::string> inPlace;
  const std::string message =
      platform::formattedText(format, arguments, platform::controlsOfStandardOutput());
  if (tag) {
    if (inPlace) platform::writeToStandardOutput("\n");
    inPlace.reset();
    platform::writeToStandardOutput(platform::formattedText("[%@] %@\n", {tag, message}));
    return;
  }
  constexpr std::string_view kIndentation = "  ";
  std::string output;
  if (inPlace) output.append(platform::utf16Length(*inPlace) + kIndentation.size(), '\b');
  platform::writeToStandardOutput(output.append(kIndentation).append(message));
  platform::flushStandardOutput();
  inPlace = message;
}
