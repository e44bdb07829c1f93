#include "platform/net/EventLoop.h"

#include <algorithm>
#include <vector>

#include "platform/net/EventSource.h"
#include "platform/net/NetworkTransfer.h"
#include "platform/net/PerThread.h"

namespace platform {
namespace {

std::vector<EventSource*>& sourcesOfThisThread() {
  return PerThread<std::vector<EventSource*>>::value();
}

}  // namespace

EventSource::EventSource() {
  sourcesOfThisThread().push_back(this);
}

EventSource::~EventSource() {
  std::erase(sourcesOfThisThread(), this);
}

bool runEventLoopOnce() {
  const std::vector<EventSource*>& sources = sourcesOfThisThread();
  if (sources.empty()) return false;
  for (;;) {
    const auto ready = std::find_if(sources.begin(), sources.end(),
                                    [](const EventSource* source) { return source->hasEvent(); });
    if (ready != sources.end()) {
      // One event only: its receiver may destroy or make sources, and run the loop itself.
      (*ready)->deliverEvent();
      return true;
    }
    if (!NetworkTransfer::runAll()) return false;
  }
}

}  // namespace platform
