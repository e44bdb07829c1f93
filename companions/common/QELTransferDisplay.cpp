#include "companions/common/QELTransferDisplay.h"

#include <algorithm>
#include <array>
#include <utility>

#include "platform/process/Terminal.h"
#include "platform/text/FormattedText.h"

namespace {

using Clock = std::chrono::steady_clock;

constexpr auto kPause = std::chrono::milliseconds(200);
/// Of what stands behind the title: " [##########]  45%  12.3 MB/s  1:23:45".
constexpr std::size_t kBarWidth = 20;
constexpr std::size_t kNumbersWidth = 29;

std::string timeText(double seconds) {
  constexpr double kTooLong = 360000;  // a hundred hours
  if (seconds >= kTooLong) return "--:--";
  const auto whole = static_cast<std::uint64_t>(seconds);
  const std::uint64_t hours = whole / 3600;
  const std::string minutes = std::to_string(whole / 60 % 60);
  const std::string rest = std::to_string(100 + whole % 60).substr(1);
  if (hours == 0) return minutes + ":" + rest;
  return std::to_string(hours) + (minutes.size() < 2 ? ":0" : ":") + minutes + ":" + rest;
}

std::string padded(const std::string& text, std::size_t width) {
  return std::string(width - std::min(width, text.size()), ' ') + text;
}

std::string barText(double share) {
  std::string bar(kBarWidth, '-');
  std::fill_n(bar.begin(), static_cast<std::size_t>(share * static_cast<double>(kBarWidth)), '#');
  return std::string("[").append(bar).append("]");
}

std::string lineOf(const QELTransferState& transfer, std::size_t columns, Clock::time_point now) {
  const double elapsed = std::chrono::duration<double>(now - transfer.start).count();
  const auto received = static_cast<double>(transfer.received - transfer.resumed);
  const double speed = elapsed > 0 ? received / elapsed : 0;
  const std::string speedText = QELSizeText(static_cast<std::uint64_t>(speed)) + "/s";
  std::string numbers;
  if (transfer.total && *transfer.total > 0) {
    const double share = std::min(
        1.0, static_cast<double>(transfer.received) / static_cast<double>(*transfer.total));
    const double left = static_cast<double>(*transfer.total) * (1 - share);
    numbers.append(1, ' ').append(barText(share));
    numbers += padded(std::to_string(static_cast<int>(share * 100)) + "%", 6) +
               padded(speedText, 13) + padded(speed > 0 ? timeText(left / speed) : "--:--", 10);
  } else {
    const std::size_t width = kBarWidth + 2 + kNumbersWidth + 1;
    numbers = padded(QELSizeText(transfer.received) + padded(speedText, 13) + std::string(10, ' '),
                     width);
  }
  const std::size_t titleWidth = columns - std::min(columns, numbers.size());
  return platform::textOfWidth(transfer.title, titleWidth) +
         numbers.substr(0, columns - titleWidth);
}

}  // namespace

QELTransferDisplay::QELTransferDisplay(std::optional<std::size_t> columns, platform::ByteSink sink)
    : columns_(columns), sink_(std::move(sink)) {}

void QELTransferDisplay::print(std::string_view line) {
  clear();
  sink_(platform::harmlessText(line) + "\n");
}

bool QELTransferDisplay::wantsDrawing(Clock::time_point now) const {
  return columns_ && (!lastDrawing_ || now - *lastDrawing_ >= kPause);
}

void QELTransferDisplay::draw(std::span<const QELTransferState> running, std::string_view summary,
                              Clock::time_point now) {
  if (!columns_) return;
  clear();
  lastDrawing_ = now;
  // The last column stays free: some terminals go to the next line when it is written.
  const std::size_t columns = std::max<std::size_t>(*columns_, 2) - 1;
  std::string drawing;
  for (const QELTransferState& transfer : running) drawing += lineOf(transfer, columns, now) + "\n";
  sink_(drawing + platform::textOfWidth(summary, columns) + "\n");
  drawnLines_ = running.size() + 1;
}

void QELTransferDisplay::clear() {
  lastDrawing_.reset();  // what follows is drawn at once
  if (drawnLines_ == 0) return;
  // Up to the first of the lines, and everything from there on erased (ECMA-48: CPL, ED).
  sink_("\x1B[" + std::to_string(std::exchange(drawnLines_, 0)) + "F\x1B[J");
}

std::string QELSizeText(std::uint64_t bytes) {
  constexpr std::array kUnits = {" kB", " MB", " GB", " TB"};
  constexpr double kStep = 1000;
  if (bytes < static_cast<std::uint64_t>(kStep)) return std::to_string(bytes) + " B";
  double size = static_cast<double>(bytes) / kStep;
  std::size_t unit = 0;
  constexpr double kRoundsUp = 999.95;
  for (; size >= kRoundsUp && unit + 1 < kUnits.size(); ++unit) size /= kStep;
  return platform::formattedText("%0.1f%@", {size, kUnits.at(unit)});
}
