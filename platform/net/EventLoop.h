#pragma once

#include <chrono>
#include <optional>

namespace platform {

/// Runs the thread's event loop once: waits until something happens on one of the thread's
/// downloads, without a deadline or no longer than the limit, and delivers the events that came of
/// it, on this thread. False when the loop has nothing to wait for.
bool runEventLoopOnce(std::optional<std::chrono::milliseconds> limit = std::nullopt);

/// Something that brings events to its thread's event loop, from its construction to its
/// destruction. For the use of platform/ alone.
class EventSource {
 public:
  EventSource();
  virtual ~EventSource();
  EventSource(const EventSource&) = delete;
  EventSource& operator=(const EventSource&) = delete;

  /// Whether an event can be delivered without waiting for the network.
  virtual bool hasEvent() const = 0;
  /// Delivers one event. May end the source's life.
  virtual void deliverEvent() = 0;

 private:
  friend bool runEventLoopOnce(std::optional<std::chrono::milliseconds>);

  EventSource* next_ = nullptr;  // of its thread's
};

}  // namespace platform
