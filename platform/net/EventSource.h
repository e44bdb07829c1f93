#pragma once

namespace platform {

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
  friend bool runEventLoopOnce();

  EventSource* next_ = nullptr;  // of its thread's
};

}  // namespace platform
