#pragma once

#include <chrono>
#include <cstddef>
#include <optional>
#include <string_view>

#include "platform/text/ErrorRecord.h"
#include "platform/time/PointInTime.h"

/// When one transfer that failed is to be tried again: up to three times, after 1, 4 and 16
/// seconds or what the server asks for, but no more than a minute.
///
///     QELRetrySchedule schedule;
///     const auto wait = schedule.waitAfter(error, answer.retryAfter, now);
///     if (!wait) return giveUp();
class QELRetrySchedule {
 public:
  /// How long to wait after the failure, which was the transfer's next. `retryAfter` is the field
  /// of that name in the server's answer (RFC 9110, section 10.2.3: seconds or a date), empty
  /// without one. Absent when there is to be no other try: after the third one, and for a failure
  /// that a wait does not mend.
  std::optional<std::chrono::milliseconds> waitAfter(const platform::ErrorRecord& error,
                                                     std::string_view retryAfter,
                                                     platform::PointInTime now);

 private:
  std::size_t failures_ = 0;
};
