#include "generators/QELFeedStyle.h"

#include <chrono>
#include <utility>

#include "platform/time/DateFormatter.h"

namespace {

using platform::PointInTime;

std::string localDateText(PointInTime date) {
  static const platform::DateFormatter formatter("EEE, dd MMM yyyy HH:mm:ss ZZZZ");
  return formatter.format(date);
}

PointInTime currentTime() {
  return std::chrono::floor<PointInTime::duration>(std::chrono::system_clock::now());
}

}  // namespace

QELFeedStyle::QELFeedStyle(QELDirectory ofDirectory)
    : directory(std::move(ofDirectory)),
      author(directory.prefix + ":author"),
      keywords(directory.prefix + ":keywords"),
      category(directory.prefix + ":category"),
      summary(directory.prefix + ":summary"),
      explicitness(directory.prefix + ":explicit"),
      image(directory.prefix + ":image"),
      dateText(&localDateText),
      now(&currentTime) {}
