#pragma once

#include <functional>
#include <string>

#include "cli/common/QELDirectory.h"
#include "platform/time/PointInTime.h"

/// What may differ from feed to feed in the rows that all have: the names of the podcast-directory
/// elements, and how dates are written. It must last until the elements that are written with it
/// have ended.
struct QELFeedStyle {
  explicit QELFeedStyle(QELDirectory directory = {});

  QELDirectory directory;
  // Names of its elements: "orvane:author", ...
  std::string author;
  std::string keywords;
  std::string category;
  std::string summary;
  std::string explicitness;
  std::string image;

  /// RFC 822 as RSS 2.0 asks for it, in the locale and the time zone of the process at first.
  std::function<std::string(platform::PointInTime)> dateText;
  /// The date of what is stamped; the current time at first.
  std::function<platform::PointInTime()> now;
};
