#include "companions/keep/QELKeepRun.h"

#include <chrono>
#include <utility>
#include <vector>

#include "platform/files/StandardStreams.h"
#include "platform/process/EndingSignals.h"
#include "platform/process/Terminal.h"
#include "platform/text/FormattedText.h"

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

int QELKeepRun::fetch(QELBundleDirectory& directory, QELTransfers transfers) {
  platform::EndingSignals signals;
  for (const auto& fetch : show_.fetches()) transfers.add(fetch);
  // From the beginning it is a bundle that can be read, and that knows its source.
  bool isWritten = write(directory);
  if (!isWritten) return kNothingDone;
  Clock::time_point lastWriting = Clock::now();
  while (isWritten && !transfers.hasEnded() && !platform::EndingSignals::hasCome()) {
    for (const auto& ended : transfers.run()) {
      if (ended->state() != QELFetch::State::kDone) continue;
      say("fetched " + ended->title() + ": " + ended->name() + " (" + QELSizeText(ended->size()) +
          ")");
    }
    transfers.draw(display_);
    if (Clock::now() - lastWriting < kWritingPause) continue;
    isWritten = write(directory);
    lastWriting = Clock::now();
  }
  transfers.cancel();
  display_.clear();
  isWritten = isWritten && write(directory);
  if (platform::EndingSignals::hasCome()) commandLine_.report("interrupted; the next run goes on");
  const int status = conclude(isWritten);
  platform::EndingSignals::passOn();
  show_.removeParts();
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
  for (const auto& fetch : show_.fetches()) {
    if (fetch->state() == QELFetch::State::kDone) fetch->forgetPart();
  }
  return true;
}

int QELKeepRun::conclude(bool isWritten) {
  std::vector<std::string> failures;
  for (const auto& fetch : show_.fetches()) {
    if (fetch->state() != QELFetch::State::kFailed) continue;
    failures.push_back(fetch->title() + ": " + fetch->reference().location->string() + ": " +
                       fetch->cause());
  }
  std::string summary = platform::formattedText(
      "%lu new, %lu known, %lu failed", {show_.newCount(), show_.knownCount(), failures.size()});
  if (const std::size_t count = show_.emptyCount()) {
    summary += ", " + std::to_string(count) + " without media";
  }
  say(summary);
  for (const std::string& title : show_.lostTitles()) {
    failures.push_back(title + ": its file is gone, and the source does not have it any more; " +
                       "put it back, or take its entry out of Info.plist");
  }
  for (const std::string& failure : failures) commandLine_.report(platform::harmlessText(failure));
  return isWritten && failures.empty() ? kAllWell : kSomethingToLookAt;
}
