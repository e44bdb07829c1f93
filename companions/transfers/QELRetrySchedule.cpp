#include "companions/transfers/QELRetrySchedule.h"

#include <algorithm>
#include <array>
#include <cstdint>

#include "dates/RFC822Parsing.h"
#include "platform/net/Download.h"
#include "platform/text/ASCII.h"
#include "platform/text/LeadingInteger.h"

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

constexpr std::array kWaits = {seconds(1), seconds(4), seconds(16)};
constexpr seconds kLongestWait(60);

/// The statuses of a server that is busy, or whose part behind it is.
constexpr std::array<std::int64_t, 7> kPassingStatuses = {408, 425, 429, 500, 502, 503, 504};

bool mayPass(const platform::ErrorRecord& error) {
  if (error.domain != "HTTP") return platform::isLostConnection(error);
  return std::find(kPassingStatuses.begin(), kPassingStatuses.end(), error.code) !=
         kPassingStatuses.end();
}

std::optional<milliseconds> waitAskedFor(std::string_view field, platform::PointInTime now) {
  const std::string_view text = platform::trimmed(field);
  if (text.empty()) return std::nullopt;
  if (std::all_of(text.begin(), text.end(), &platform::isASCIIDigit)) {
    return seconds(std::min<std::int64_t>(platform::leadingInteger(text), kLongestWait.count()));
  }
  const auto date = dateWithRFC822String(text);
  if (!date) return std::nullopt;
  return std::clamp<milliseconds>(*date - now, milliseconds(0), kLongestWait);
}

}  // namespace

std::optional<milliseconds> QELRetrySchedule::waitAfter(const platform::ErrorRecord& error,
                                                        std::string_view retryAfter,
                                                        platform::PointInTime now) {
  if (failures_ == kWaits.size() || !mayPass(error)) return std::nullopt;
  const milliseconds planned = kWaits.at(failures_++);
  return waitAskedFor(retryAfter, now).value_or(planned);
}
