#pragma once

#include <memory>
#include <string>
#include <utility>

#include "model/QELPodcastSource.h"
#include "platform/plist/PropertyListValue.h"

/// A podcast source that reads a reference file: a property list whose root is a reference
/// dictionary ("PodcastName", "Episodes", ...).
class QELReferenceFilePodcastSource : public QELPodcastSource {
 public:
  /// A source for the reference file at the path; null when the file is missing, unreadable, no
  /// property list or one whose root is no dictionary.
  static std::unique_ptr<QELReferenceFilePodcastSource> initWithPath(const std::string& path);

  /// A source for the reference dictionary, which it shares; null for a null dictionary.
  static std::unique_ptr<QELReferenceFilePodcastSource> initWithDictionary(
      std::shared_ptr<const platform::Dictionary> dictionary);

  explicit QELReferenceFilePodcastSource(std::shared_ptr<const platform::Dictionary> refData)
      : refData_(std::move(refData)) {}

  /// Fills the fields from the dictionary; a missing key leaves its field absent, and every element
  /// of "Episodes" becomes an episode, whatever it holds. The podcast's own reference types are
  /// taken as they stand, never derived. Fails only without a dictionary.
  bool loadSourceWithError(platform::ErrorSlot& error) override;

 private:
  std::shared_ptr<const platform::Dictionary> refData_;
};

/// The dictionary that the value holds, sharing its lifetime; null for a null value or another
/// kind.
std::shared_ptr<const platform::Dictionary> QELSharedDictionary(
    const std::shared_ptr<const platform::PropertyListValue>& value);
