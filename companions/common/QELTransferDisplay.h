#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "platform/text/ByteSink.h"

/// How far one running transfer is.
struct QELTransferState {
  std::string title;
  std::uint64_t received = 0;          // bytes of the file that are there
  std::uint64_t resumed = 0;           // of them, those of an earlier try
  std::optional<std::uint64_t> total;  // bytes, where the server told
  std::chrono::steady_clock::time_point start;
};

/// Shows the progress of several transfers: on a terminal a line for each running one, with a bar,
/// its speed and the time left, drawn over and over again below the lines that stay; elsewhere only
/// the lines that stay.
///
///     QELTransferDisplay display(platform::terminalColumns(), sink);
///     if (display.wantsDrawing(now)) display.draw(running, "3 of 12 files", now);
///     display.print("fetched one.mp3");
class QELTransferDisplay {
 public:
  /// The columns are those of the terminal, absent for a pipe or a file. The sink is given what is
  /// to be shown.
  QELTransferDisplay(std::optional<std::size_t> columns, platform::ByteSink sink);

  /// Prints a line that stays. Whoever prints something else calls `clear` before.
  void print(std::string_view line);

  /// Whether it is time to draw: on a terminal, five times a second.
  bool wantsDrawing(std::chrono::steady_clock::time_point now) const;
  /// Draws the running transfers and a line about all of them.
  void draw(std::span<const QELTransferState> running, std::string_view summary,
            std::chrono::steady_clock::time_point now);

  /// Removes what was drawn.
  void clear();

 private:
  std::optional<std::size_t> columns_;
  platform::ByteSink sink_;
  std::size_t drawnLines_ = 0;
  std::optional<std::chrono::steady_clock::time_point> lastDrawing_;
};

/// A number of bytes for people: "999 B", "1.0 kB", "12.3 MB".
std::string QELSizeText(std::uint64_t bytes);
