#include "companions/transfers/QELFetch.h"

#include <utility>

#include "platform/files/FileManager.h"

using platform::Download;
using platform::ErrorSlot;

QELFetch::QELFetch(std::string title, QELMediaReference reference, platform::FilePlace place,
                   std::unique_ptr<QELPart> part)
    : reference_(std::move(reference)), place_(std::move(place)), part_(std::move(part)) {
  progress_.title = std::move(title);
}

void QELFetch::refuse(const std::string& cause) {
  cause_ = cause;
  state_ = State::kFailed;
}

void QELFetch::start(int stallLimit) {
  progress_.received = progress_.resumed = 0;
  progress_.total.reset();
  progress_.start = Clock::now();
  if (!reference_.isRemote) {
    ErrorSlot error;
    if (platform::copyFile(reference_.location->string(), place_, error)) return finish();
    return refuse(error->description);
  }
  state_ = State::kRunning;
  platform::DownloadOptions options;
  options.replaces = false;
  options.stallLimit = stallLimit;
  if (part_) {
    options.partName = part_->name();
    options.partValidator = validator_ = part_->validator();
    part_->note("");
  }
  platform::DownloadReceiver& receiver = *this;
  download_ = std::make_unique<Download>(*reference_.url, place_, receiver, std::move(options));
}

void QELFetch::cancel() {
  download_.reset();
  if (part_ && state_ == State::kRunning) part_->note(validator_);
  state_ = State::kWaiting;
}

void QELFetch::didReceiveResponse(Download& download, std::int64_t expectedLength) {
  progress_.received = progress_.resumed = download.resumedLength();
  if (expectedLength >= 0) progress_.total = static_cast<std::uint64_t>(expectedLength);
  if (!part_) return;
  // The rest of a file need not be announced with what the whole was.
  const std::string& validator = download.answer().validator;
  if (progress_.resumed == 0 || !validator.empty()) validator_ = validator;
  part_->note(validator_);
}

void QELFetch::didReceiveDataOfLength(Download& /*download*/, std::uint64_t length) {
  progress_.received += length;
}

void QELFetch::downloadDidFinish(Download& /*download*/) {
  if (part_) part_->remove();
  finish();
}

void QELFetch::didFailWithError(Download& download, const platform::ErrorRecord& error) {
  const auto now = std::chrono::floor<std::chrono::milliseconds>(std::chrono::system_clock::now());
  const auto wait = schedule_.waitAfter(error, download.answer().retryAfter, now);
  // A part that nothing vouches for is of no use.
  if (part_ && !validator_.empty()) part_->note(validator_);
  if (part_ && validator_.empty()) part_->remove();
  if (!wait) return refuse(error.description);
  state_ = State::kWaiting;
  dueTime_ = Clock::now() + *wait;
}

void QELFetch::finish() {
  progress_.received = place_.directory->fileSize(place_.name).value_or(0);
  if (progress_.received > 0) {
    state_ = State::kDone;
    return;
  }
  ErrorSlot ignored;
  place_.directory->remove(place_.name, ignored);
  refuse("The file is empty");
}
