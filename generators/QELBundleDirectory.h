#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "platform/files/Directory.h"
#include "platform/plist/PropertyListValue.h"
#include "platform/text/ErrorRecord.h"
#include "platform/text/Text.h"

/// The directory that becomes a bundle, with its "Posters", both opened once: whatever happens to
/// their paths meanwhile, files come into these two directories and nowhere else.
///
/// One run at a time fills it, where the directory can be locked (platform::Directory); the others
/// wait for their turn. No file that was saved here replaces another that was: a file system may
/// take two names for one.
class QELBundleDirectory {
 public:
  QELBundleDirectory() = default;
  ~QELBundleDirectory() = default;
  QELBundleDirectory(const QELBundleDirectory&) = delete;
  QELBundleDirectory& operator=(const QELBundleDirectory&) = delete;

  static constexpr std::string_view kReferenceFileName = "Info.plist";
  static constexpr std::string_view kPostersName = "Posters";

  /// Makes the directory and its parents where they are missing, and "Posters", whose failure is
  /// left to those who want to put something there; takes the lock, waiting for it or not; removes
  /// what killed runs left. False, and the slot filled, when there is no such directory, and when
  /// the lock is not waited for and held by another run.
  bool open(const std::string& path, platform::ErrorSlot& error,
            platform::Directory::Wait wait = platform::Directory::Wait::kForever);

  const platform::Directory& directory() const { return bundle_; }
  const platform::Directory& posters() const { return posters_; }

  /// The reference dictionary of the bundle at the path, empty where there is none yet. Absent, and
  /// the slot filled, when it cannot be read.
  static std::optional<platform::Dictionary> readReferenceFile(const std::string& path,
                                                               platform::ErrorSlot& error);
  /// The size of the file to which a reference in that dictionary leads, in bytes. Absent when it
  /// is not there, is no regular file, lies outside of the bundle or is the reference file itself;
  /// an empty one is as good as none.
  static std::optional<std::uint64_t> sizeOfFile(const std::string& path,
                                                 const platform::OptionalText& reference);

  /// Absent for a name that no file can have, and for the one that the reference file has.
  std::optional<platform::FilePlace> mediaPlace(const std::string& name) const;
  /// Absent for a name that no file can have, and while "Posters" is a link that leads out of the
  /// bundle, or nowhere.
  std::optional<platform::FilePlace> posterPlace(const std::string& name) const;

  /// Has a file be put at a place of this bundle. False when that fails, and when the file there is
  /// one that was saved under another name, or has the reference file's.
  bool save(const platform::FilePlace& place, const std::function<bool()>& put);

  /// Writes the reference file, which replaces an earlier one and keeps its permissions. It gets
  /// its name when everything that was saved is on the disk, and is there itself in the end. False,
  /// and the slot filled, on failure.
  bool writeReferenceFile(const platform::Dictionary& dictionary, platform::ErrorSlot& error);

 private:
  bool isInUse(const platform::FilePlace& place) const;
  bool syncFiles(platform::ErrorSlot& error) const;

  platform::Directory bundle_;
  platform::Directory posters_;
  /// What was saved, and where last.
  std::map<platform::FileIdentity, platform::FilePlace> saved_;
  /// The names of what was saved, by their directory and case folded: a file system that takes two
  /// for one (FAT) may have forgotten a file's number, and give it another.
  std::map<std::pair<const platform::Directory*, std::string>, std::string> savedNames_;
};
