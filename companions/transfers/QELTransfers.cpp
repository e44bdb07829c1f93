#include "companions/transfers/QELTransfers.h"

#include <algorithm>
#include <chrono>
#include <thread>
#include <utility>

#include "platform/net/EventLoop.h"
#include "platform/text/FormattedText.h"

namespace {

constexpr auto kLongestWait = std::chrono::milliseconds(200);

}  // namespace

QELTransfers::QELTransfers(std::int64_t jobs, int stallLimit)
    : jobs_(static_cast<std::size_t>(jobs)), stallLimit_(stallLimit) {}

void QELTransfers::add(std::shared_ptr<QELFetch> fetch) {
  if (fetch->state() == QELFetch::State::kHeld) return;
  // Two of one URL may run at once.
  if (!partNames_.insert(fetch->partName()).second) fetch->forgoPart();
  queue_.push_back(std::move(fetch));
  ++count_;
}

/// Null when nothing is due.
std::shared_ptr<QELFetch> QELTransfers::takeNext() {
  const auto now = QELFetch::Clock::now();
  const auto due = std::find_if(later_.begin(), later_.end(),
                                [now](const auto& fetch) { return fetch->dueTime() <= now; });
  std::shared_ptr<QELFetch> next;
  if (due != later_.end()) {
    next = std::move(*due);
    later_.erase(due);
  } else if (!queue_.empty()) {
    next = std::move(queue_.front());
    queue_.pop_front();
  }
  return next;
}

QELTransfers::Fetches QELTransfers::run() {
  bool isAllRunning = true;
  while (isAllRunning && running_.size() < jobs_) {
    std::shared_ptr<QELFetch> next = takeNext();
    if (!next) break;
    if (next->state() == QELFetch::State::kWaiting) next->start(stallLimit_);
    isAllRunning = next->state() == QELFetch::State::kRunning;
    running_.push_back(std::move(next));
  }
  if (running_.empty()) {
    std::this_thread::sleep_for(kLongestWait);
  } else if (isAllRunning) {
    platform::runEventLoopOnce(kLongestWait);
  }

  Fetches ended;
  std::erase_if(running_, [&](const std::shared_ptr<QELFetch>& fetch) {
    if (fetch->state() == QELFetch::State::kRunning) return false;
    (fetch->state() == QELFetch::State::kWaiting ? later_ : ended).push_back(fetch);
    return true;
  });
  endedCount_ += ended.size();
  for (const auto& fetch : ended) {
    if (fetch->state() != QELFetch::State::kDone) continue;
    if (auto follower = fetch->release()) add(std::move(follower));
  }
  return ended;
}

void QELTransfers::draw(QELTransferDisplay& display) const {
  const auto now = QELFetch::Clock::now();
  if (!display.wantsDrawing(now)) return;
  std::vector<QELTransferState> states;
  for (const auto& fetch : running_) states.push_back(fetch->progress());
  display.draw(states, platform::formattedText("%lu of %lu files", {endedCount_, count_}), now);
}

void QELTransfers::cancel() {
  for (const auto& fetch : running_) fetch->cancel();
}
