#include "companions/transfers/QELFetch.h"

#include <utility>

#include "platform/files/FileManager.h"
#include "platform/net/URLFault.h"

using platform::Download;
using platform::ErrorSlot;

QELFetch::QELFetch(std::string title, QELMediaReference reference,
                   const std::optional<platform::FilePlace>& place, const std::string& folder,
                   bool allowsLocalFiles, std::string_view uuid)
    : reference_(std::move(reference)), place_(place.value_or(platform::FilePlace(""))) {
  progress_.title = std::move(title);
  if (!place) {
    refuse("There is no place for it");
  } else if (reference_.isRemote && !reference_.url) {
    refuse("It is no valid URL");
  } else if (!reference_.isRemote && platform::looksLikeURL(*reference_.location)) {
    refuse(platform::hasFetchedScheme(*reference_.location)
               ? "It is a URL, but its type is not \"remote\""
               : "Only http, https and file URLs are fetched");
  } else if (!allowsLocalFiles && (!reference_.isRemote || reference_.url->scheme() == "file")) {
    refuse("A feed of the network names a local file, see --allow-local");
  } else if (reference_.isRemote && reference_.url->scheme() != "file") {
    part_ = std::make_unique<QELPart>(*place->directory, folder, reference_.url->encodedText(),
                                      progress_.title + std::string(uuid));
    finishedName_ = part_->finishedName();
  }
}

void QELFetch::hold() {
  if (state_ == State::kWaiting) state_ = State::kHeld;
}

std::shared_ptr<QELFetch> QELFetch::release() {
  if (!follower_ || follower_->state_ != State::kHeld) return nullptr;
  follower_->state_ = State::kWaiting;
  return follower_;
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
  if (part_ && finishedName_) {
    place_.name = *finishedName_;
    return finish();
  }
  state_ = State::kRunning;
  platform::DownloadOptions options;
  options.replaces = false;
  options.stallLimit = stallLimit;
  if (part_) {
    options.partName = part_->name();
    options.partValidator = validator_ = part_->validator();
    part_->removeNote();
  }
  platform::DownloadReceiver& receiver = *this;
  download_ = std::make_unique<Download>(*reference_.url, place_, receiver, std::move(options));
}

void QELFetch::cancel() {
  download_.reset();
  if (state_ == State::kRunning) keepPart();
  state_ = State::kWaiting;
}

void QELFetch::forgetPart() {
  if (part_) part_->remove();
  part_.reset();
}

/// A part that nothing vouches for is of no use. Nor is one that this system failed to store: on a
/// full disk it would take the room of what came whole.
void QELFetch::keepPart() const {
  if (part_ && validator_.empty()) part_->remove();
  if (part_ && !validator_.empty()) part_->note(validator_, place_.name, progress_.total);
}

void QELFetch::didReceiveResponse(Download& download, std::int64_t expectedLength) {
  progress_.received = progress_.resumed = download.resumedLength();
  if (expectedLength >= 0) progress_.total = static_cast<std::uint64_t>(expectedLength);
  if (!part_) return;
  // The rest of a file need not be announced with what the whole was.
  const std::string& validator = download.answer().validator;
  if (progress_.resumed == 0 || !validator.empty()) validator_ = validator;
  part_->note(validator_, place_.name, progress_.total);
}

void QELFetch::didReceiveDataOfLength(Download& /*download*/, std::uint64_t length) {
  progress_.received += length;
}

void QELFetch::downloadDidFinish(Download& /*download*/) {
  finish();
}

void QELFetch::didFailWithError(Download& download, const platform::ErrorRecord& error) {
  const auto now = std::chrono::floor<std::chrono::milliseconds>(std::chrono::system_clock::now());
  const auto wait = schedule_.waitAfter(error, download.answer().retryAfter, now);
  if (error.domain == "POSIX") {
    forgetPart();
  } else {
    keepPart();
  }
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
  forgetPart();
  refuse("The file is empty");
}
