#pragma once

#include <chrono>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "companions/common/QELTransferDisplay.h"
#include "companions/transfers/QELPart.h"
#include "companions/transfers/QELRetrySchedule.h"
#include "model/QELMediaReference.h"
#include "platform/net/Download.h"

/// One file that a run fetches: a URL is downloaded, in several tries where that helps, a path is
/// copied. Nothing is ever replaced by it.
class QELFetch : private platform::DownloadReceiver {
 public:
  using Clock = std::chrono::steady_clock;
  enum class State { kHeld, kWaiting, kRunning, kDone, kFailed };

  /// `title` says what it is, for people; the uuid, which may be empty, tells it from others of the
  /// URL and title; the folder is the path of the place's directory. It fails at once without a
  /// place, where the reference is no URL and should be one, or one that is not fetched, and for a
  /// local file where none is allowed. What the place refers to must outlive this.
  ///
  /// A download goes on from the part that an earlier try left, and leaves one behind when it
  /// fails; a file that an earlier run had no time to list is taken as it is.
  QELFetch(std::string title, QELMediaReference reference,
           const std::optional<platform::FilePlace>& place, const std::string& folder,
           bool allowsLocalFiles, std::string_view uuid = {});

  /// The name of its part; empty for one that has none.
  std::string partName() const { return part_ ? part_->name() : ""; }
  /// Has it do without a part.
  void forgoPart() { part_.reset(); }

  /// Holds it, unless it has failed, until one that it follows is done: alone it is of no use.
  void hold();
  void setFollower(std::shared_ptr<QELFetch> follower) { follower_ = std::move(follower); }
  /// Lets the follower go. Null when there is none, or it is not held any more.
  std::shared_ptr<QELFetch> release();

  /// Fails it without a try.
  void refuse(const std::string& cause);
  /// Begins the next try; `stallLimit` is the number of seconds without a byte after which it
  /// fails. A copy has ended when this returns.
  void start(int stallLimit);
  /// Ends the running try; its part stays.
  void cancel();
  /// Says that the file, which is done, has been listed.
  void forgetPart();

  State state() const { return state_; }
  /// While it waits, when the next try is due.
  Clock::time_point dueTime() const { return dueTime_; }
  /// How far the running try is.
  const QELTransferState& progress() const { return progress_; }

  const std::string& title() const { return progress_.title; }
  const QELMediaReference& reference() const { return reference_; }
  /// The file's name in its directory.
  const std::string& name() const { return place_.name; }
  /// Its size in bytes, once it is done.
  std::uint64_t size() const { return progress_.received; }
  /// Why it failed.
  const std::string& cause() const { return cause_; }

 private:
  void didReceiveResponse(platform::Download& download, std::int64_t expectedLength) override;
  void didReceiveDataOfLength(platform::Download& download, std::uint64_t length) override;
  void downloadDidFinish(platform::Download& download) override;
  void didFailWithError(platform::Download& download, const platform::ErrorRecord& error) override;

  void keepPart() const;
  void finish();

  QELMediaReference reference_;
  platform::FilePlace place_;
  std::unique_ptr<QELPart> part_;
  std::optional<std::string> finishedName_;  // as it was before any fetch of this run began
  std::string validator_;                    // of the part, as the next try finds it
  QELRetrySchedule schedule_;
  QELTransferState progress_;
  State state_ = State::kWaiting;
  Clock::time_point dueTime_;
  std::string cause_;
  std::unique_ptr<platform::Download> download_;
  std::shared_ptr<QELFetch> follower_;
};
