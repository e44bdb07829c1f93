#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "model/QELPodcastSource.h"
#include "platform/time/PointInTime.h"

/// Which episodes of a source are wanted, by their dates.
struct QELSelection {
  /// So many, those with the latest dates; those without a date come last.
  std::optional<std::int64_t> latest;
  /// Those of this date or later; one without a date is none of them.
  std::optional<platform::PointInTime> since;

  /// For each episode of the source whether it is wanted. Of those of one date the source's first
  /// are.
  std::vector<bool> of(const QELPodcastSource& source) const;
};

/// The point in time that a user writes as "2026-05-31" (midnight in the local time zone) or as RFC
/// 3339 has it ("2026-05-31T09:30:00Z", "2026-05-31 09:30:00.5+02:00"). Absent for anything else.
std::optional<platform::PointInTime> QELDateOf(const std::string& text);
