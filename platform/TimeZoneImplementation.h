#pragma once

#include <unicode/timezone.h>

#include <memory>
#include <utility>

#include "platform/TimeZone.h"

namespace platform {

/// ICU's zone behind a TimeZone, for the sources of this folder: a header of ICU goes no further.
class TimeZone::Implementation {
 public:
  explicit Implementation(std::unique_ptr<const icu::TimeZone> zone) : zone_(std::move(zone)) {}

  const icu::TimeZone& zone() const { return *zone_; }

 private:
  std::unique_ptr<const icu::TimeZone> zone_;
};

}  // namespace platform
