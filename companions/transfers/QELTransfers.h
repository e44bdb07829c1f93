#pragma once

#include <cstddef>
#include <deque>
#include <memory>
#include <vector>

#include "companions/transfers/QELFetch.h"

/// Fetches many files, several at once, each in its turn; one that waits for its next try holds
/// nobody up.
class QELTransfers {
 public:
  using Fetches = std::vector<std::shared_ptr<QELFetch>>;

  /// At most `jobs` at once. For the limit see QELFetch.
  QELTransfers(std::size_t jobs, int stallLimit) : jobs_(jobs), stallLimit_(stallLimit) {}

  void add(std::shared_ptr<QELFetch> fetch) { queue_.push_back(std::move(fetch)); }
  bool hasEnded() const { return queue_.empty() && later_.empty() && running_.empty(); }
  const Fetches& running() const { return running_; }

  /// Starts what is due, and waits until something happens, but no longer than a fifth of a second.
  /// Gives those that are done or failed now.
  Fetches run();

  /// Ends all that are running.
  void cancel();

 private:
  std::shared_ptr<QELFetch> takeNext();

  std::size_t jobs_;
  int stallLimit_;
  std::deque<std::shared_ptr<QELFetch>> queue_;
  Fetches later_;  // for another try
  Fetches running_;
};
