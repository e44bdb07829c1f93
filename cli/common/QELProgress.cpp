#include "cli/common/QELProgress.h"

#include <string>

#include "platform/files/StandardStreams.h"
#include "platform/text/Characters.h"

bool QELShouldReportProgress = false;

namespace {

/// The in-place message that is on screen now, for the next one to be drawn over it.
std::optional<std::string>& lastProgress() {
  static std::optional<std::string> message;
  return message;
}

constexpr std::string_view kIndentation = "  ";

void drawInPlace(std::string message) {
  std::string output;
  if (lastProgress()) {
    output.append(platform::utf16Length(*lastProgress()) + kIndentation.size(), '\b');
  }
  output.append(kIndentation).append(message);
  platform::writeToStandardOutput(output);
  platform::flushStandardOutput();
  lastProgress() = std::move(message);
}

void printLine(std::string_view tag, std::string_view message) {
  if (lastProgress()) {
    lastProgress().reset();
    platform::writeToStandardOutput("\n");
  }
  platform::writeToStandardOutput(platform::formattedText("[%@] %@\n", {tag, message}));
}

}  // namespace

void QELReportProgress(std::optional<std::string_view> tag, std::string_view format,
                       std::initializer_list<platform::FormatArgument> arguments) {
  std::string message = platform::formattedText(format, arguments);
  if (tag) {
    printLine(*tag, message);
  } else {
    drawInPlace(std::move(message));
  }
}
