#include "companions/keep/QELKeepRun.h"

#include <chrono>
#include <utility>
#include <vector>

#include "companions/transfers/QELPart.h"
#include "platform/files/EndingSignals.h"
#include "platform/files/StandardStreams.h"
#include "platform/files/Terminal.h"

namespace {

using Clock = QELFetch::Clock;

/// How long what is whole may remain unlisted.
constexpr auto kWritingPause = std::chrono::seconds(10);

bool showText(std::string_view text) {
  platform::writeToStandardOutput(text);
  platform::flushStandardOutput();
  return true;
}

}  // namespace

QELKeepRun::QELKeepRun(const QELCommandLine& commandLine, QELKeptShow& show,
                       platform::Dictionary kept, bool isQuiet)
    : commandLine_(commandLine),
      show_(show),
      written_(std::move(kept)),
      isQuiet_(isQuiet),
      display_(isQuiet ? std::nullopt : platform::terminalColumns(), &showText) {}

void QELKeepRun::say(const std::string& line) {
  if (!isQuiet_) display_.print(line);
}

int QELKeepRun::rehearse() {
  std::size_t count = 0;
  for (const auto& fetch : show_.fetches()) {
    const bool isRefused = fetch->state() == QELFetch::State::kFailed;
    if (!isRefused) ++count;
    say((isRefused ? "would not fetch " : "would fetch ") + fetch->title() + " from " +
        fetch->reference().location->string() + (isRefused ? ": " + fetch->cause() : ""));
  }
  say(std::to_string(count) + " to fetch, " + std::to_string(show_.knownCount()) + " known");
  return kAllWell;
}

int QELKeepRun::fetch(QELBundleDirectory& directory, const std::string& path,
                      QELTransfers transfers) {
  platform::EndingSignals signals;
  for (const auto& fetch : show_.fetches()) transfers.add(fetch);
  std::size_t endedCount = 0;
  Clock::time_point lastWriting = Clock::now();
  bool isWritten = true;
  while (isWritten && !transfers.hasEnded() && !platform::EndingSignals::hasCome()) {
    for (const auto& ended : transfers.run()) {
      ++endedCount;
      if (ended->state() != QELFetch::State::kDone) continue;
      say("fetched " + ended->title() + ": " + ended->name() + " (" + QELSizeText(ended->size()) +
          ")");
    }
    draw(transfers, endedCount);
    if (Clock::now() - lastWriting < kWritingPause) continue;
    isWritten = write(directory);
    lastWriting = Clock::now();
  }
  transfers.cancel();
  display_.clear();
  isWritten = isWritten && write(directory);
  const bool wasInterrupted = platform::EndingSignals::hasCome();
  if (wasInterrupted) commandLine_.report("interrupted; the next run goes on");
  const int status = conclude(isWritten);
  if (status == kAllWell && !wasInterrupted) QELPart::removeAll(directory.directory(), path);
  signals.passOn();
  return status;
}

bool QELKeepRun::write(QELBundleDirectory& directory) {
  platform::Dictionary dictionary = show_.dictionary();
  if (dictionary == written_) return true;
  platform::ErrorSlot error;
  if (!directory.writeReferenceFile(dictionary, error)) {
    display_.clear();
    commandLine_.report("could not write Info.plist: " + error->description);
    return false;
  }
  written_ = std::move(dictionary);
  return true;
}

void QELKeepRun::draw(const QELTransfers& transfers, std::size_t endedCount) {
  const Clock::time_point now = Clock::now();
  if (!display_.wantsDrawing(now)) return;
  std::vector<QELTransferState> states;
  for (const auto& fetch : transfers.running()) states.push_back(fetch->progress());
  display_.draw(
      states,
      std::to_string(endedCount) + " of " + std::to_string(show_.fetches().size()) + " files", now);
}

int QELKeepRun::conclude(bool isWritten) {
  std::size_t failedCount = 0;
  for (const auto& fetch : show_.fetches()) {
    if (fetch->state() == QELFetch::State::kFailed) ++failedCount;
  }
  std::string summary = std::to_string(show_.newCount()) + " new, " +
                        std::to_string(show_.knownCount()) + " known, " +
                        std::to_string(failedCount) + " failed";
  if (show_.emptyCount() > 0) {
    summary += ", " + std::to_string(show_.emptyCount()) + " without media";
  }
  say(summary);
  for (const auto& fetch : show_.fetches()) {
    if (fetch->state() != QELFetch::State::kFailed) continue;
    commandLine_.report(platform::harmlessText(
        fetch->title() + ": " + fetch->reference().location->string() + ": " + fetch->cause()));
  }
  for (const std::string& title : show_.lostTitles()) {
    commandLine_.report(platform::harmlessText(title) +
                        ": its file is gone, and the source does not have it any more");
  }
  const bool isAllWell = isWritten && failedCount == 0 && show_.lostTitles().empty();
  return isAllWell ? kAllWell : kSomethingToLookAt;
}
