#pragma once

namespace platform {

/// While one exists, SIGINT, SIGTERM and SIGHUP do not end the process but are noted, so that it
/// can end in its own time. The second signal of a kind does what it always did. One that was
/// ignored (as under nohup) stays so. One at a time.
///
///     EndingSignals signals;
///     while (!signals.hasCome() && work()) continue;
///     tidyUp();
///     EndingSignals::passOn();
class EndingSignals {
 public:
  EndingSignals();
  ~EndingSignals();
  EndingSignals(const EndingSignals&) = delete;
  EndingSignals& operator=(const EndingSignals&) = delete;

  static bool hasCome();

  /// Lets the signal that came, if one did, end the process after all, so that its parent learns of
  /// it.
  static void passOn();
};

}  // namespace platform
