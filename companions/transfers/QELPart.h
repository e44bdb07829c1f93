#pragma once

#include <string>

#include "platform/files/Directory.h"

/// The part of a file that a try left in the bundle's directory, and a note beside it of what
/// proves that a server still has the same file, so that another try can go on behind the part.
///
/// The names are ".qel-keep-", a digest of the URL, and ".part" or ".note".
class QELPart {
 public:
  /// `path` is that of the directory. Both must outlive this.
  QELPart(const platform::Directory& directory, const std::string& path, const std::string& url);

  const std::string& name() const { return name_; }

  /// The validator of the answer that the part came from. Empty without a part that can be gone on
  /// from: one of another URL, say, or from before the system was started anew, when a power cut
  /// may have lost some of its middle.
  std::string validator() const;

  /// Notes the validator, empty for none. While the part may change there is to be no note: the
  /// process can end at any moment.
  void note(const std::string& validator) const;

  /// Removes part and note.
  void remove() const;

  /// Removes all parts and notes of the directory.
  static void removeAll(const platform::Directory& directory, const std::string& path);

 private:
  std::string noteBeginning() const;

  const platform::Directory& directory_;
  const std::string& path_;
  std::string url_;
  std::string name_;
  std::string noteName_;
};
