#include "model/QELSelection.h"

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <functional>
#include <numeric>
#include <string_view>

#include "platform/plist/PropertyListDate.h"
#include "platform/text/ASCII.h"
#include "platform/text/Case.h"
#include "platform/text/LeadingInteger.h"
#include "platform/time/TimeZone.h"

namespace {

constexpr std::size_t kDateLength = 10;

/// Whether the text has the pattern's length and its characters, "0" standing for any digit.
bool hasForm(std::string_view text, std::string_view pattern) {
  return std::equal(text.begin(), text.end(), pattern.begin(), pattern.end(), [](char c, char p) {
    return p == '0' ? platform::isASCIIDigit(c) : platform::uppercasedASCII(c) == p;
  });
}

/// How far the zone of an RFC 3339 text is ahead of UTC.
std::optional<std::chrono::minutes> offsetOf(std::string_view zone) {
  if (hasForm(zone, "Z")) return std::chrono::minutes(0);
  if (!hasForm(zone, "+00:00") && !hasForm(zone, "-00:00")) return std::nullopt;
  const std::int64_t hours = platform::leadingInteger(zone.substr(1, 2));
  const std::int64_t minutes = platform::leadingInteger(zone.substr(4));
  if (hours >= 24 || minutes >= 60) return std::nullopt;
  const std::chrono::minutes offset(hours * 60 + minutes);
  return zone[0] == '-' ? -offset : offset;
}

}  // namespace

std::vector<bool> QELSelection::of(const QELPodcastSource& source) const {
  if (!source.episodes()) return {};
  const QELEpisodeList& episodes = *source.episodes();
  std::vector<bool> isWanted(episodes.size());
  std::vector<std::size_t> order(episodes.size());
  std::iota(order.begin(), order.end(), 0);
  std::vector<QELEpisode::OptionalDate> dates;
  for (const auto& episode : episodes) dates.push_back(episode->date());
  if (latest) {
    std::ranges::stable_sort(order, std::greater(),
                             [&](std::size_t index) { return dates[index]; });
    order.resize(std::min(order.size(), static_cast<std::size_t>(*latest)));
  }
  for (const std::size_t index : order) {
    isWanted[index] = !since || (dates[index] && *dates[index] >= *since);
  }
  return isWanted;
}

std::optional<platform::PointInTime> QELDateOf(const std::string& text) {
  if (hasForm(text, "0000-00-00")) {
    const auto date = platform::dateFromPropertyListText(text + "T00:00:00Z");
    if (!date) return std::nullopt;
    const platform::TimeZone::LocalTime midnight(date->time_since_epoch());
    return *date - std::chrono::seconds(platform::TimeZone::local().offsetAtLocalTime(midnight));
  }
  constexpr std::string_view kForm = "0000-00-00T00:00:00";
  std::string moment = text.substr(0, kForm.size());
  if (moment.size() > kDateLength && moment[kDateLength] == ' ') moment[kDateLength] = 'T';
  if (!hasForm(moment, kForm)) return std::nullopt;
  std::string_view rest = std::string_view(text).substr(kForm.size());
  if (rest.starts_with('.')) {  // a fraction, which selects nothing else
    const std::size_t end = std::min(rest.find_first_not_of("0123456789", 1), rest.size());
    if (end == 1) return std::nullopt;
    rest.remove_prefix(end);
  }
  const auto date = platform::dateFromPropertyListText(platform::uppercased(moment) + "Z");
  const auto offset = offsetOf(rest);
  if (!date || !offset) return std::nullopt;
  return *date - *offset;
}
