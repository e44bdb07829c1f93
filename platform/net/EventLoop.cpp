#include "platform/net/EventLoop.h"

#include "platform/net/NetworkTransfer.h"

namespace platform {
namespace {

/// The thread's sources, the oldest first.
constinit thread_local EventSource* firstSource = nullptr;

}  // namespace

EventSource::EventSource() {
  EventSource** link = &firstSource;
  while (*link != nullptr) link = &(*link)->next_;
  *link = this;
}

EventSource::~EventSource() {
  EventSource** link = &firstSource;
  while (*link != this) link = &(*link)->next_;
  *link = next_;
}

bool runEventLoopOnce(std::optional<std::chrono::milliseconds> limit) {
  bool hasWaited = false;
  while (firstSource != nullptr) {
    for (EventSource* source = firstSource; source != nullptr; source = source->next_) {
      if (!source->hasEvent()) continue;
      // One event only: its receiver may destroy or make sources, and run the loop itself.
      source->deliverEvent();
      return true;
    }
    if (limit && hasWaited) return true;
    if (!NetworkTransfer::runAll(limit)) return false;
    hasWaited = true;
  }
  return false;
}

}  // namespace platform
