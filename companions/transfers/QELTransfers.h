#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "companions/transfers/QELFetch.h"

/// Fetches many files, several at once, each in its turn; one that waits for its next try holds
/// nobody up.
class QELTransfers {
 public:
  using Fetches = std::vector<std::shared_ptr<QELFetch>>;

  /// At most `jobs` at once. For the limit see QELFetch. Both are at least 1.
  QELTransfers(std::int64_t jobs, int stallLimit);

  /// One that is held is added when it is let go.
  void add(std::shared_ptr<QELFetch> fetch);
  bool hasEnded() const { return endedCount_ == count_; }

  /// Starts what is due, and waits until something happens, but no longer than a fifth of a second.
  /// Gives those that are done or failed now.
  Fetches run();

  /// Shows how far the running ones are, when the display wants it.
  void draw(QELTransferDisplay& display) const;

  /// Ends all that are running.
  void cancel();

 private:
  std::shared_ptr<QELFetch> takeNext();

  std::size_t jobs_;
  int stallLimit_;
  std::deque<std::shared_ptr<QELFetch>> queue_;
  Fetches later_;  // for another try
  Fetches running_;
  std::set<std::string> partNames_;
  std::size_t count_ = 0;
  std::size_t endedCount_ = 0;
};
