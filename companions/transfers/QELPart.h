#pragma once

#include <cstdint>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "platform/files/Directory.h"

/// The part of a file that a try left in its directory, and a note beside it. The note says what
/// proves that a server still has the same file, so that another try can go on behind the part; and
/// which name the whole file gets, so that one that a run had no time to list is not lost.
///
/// The names are ".qel-keep-", a digest of the URL, the title and the uuid, and ".part" or ".note".
/// Of one URL another episode may come each week, as of "latest.mp3"; each has its own part.
class QELPart {
 public:
  /// `path` is that of the directory, which must outlive this. The title, with the uuid behind it
  /// where there is one, tells the file from others of the URL.
  QELPart(const platform::Directory& directory, std::string path, const std::string& url,
          const std::string& titleAndUUID);

  const std::string& name() const { return name_; }

  /// The validator of the answer that the part came from. Empty without a part that can be gone on
  /// from: one of another file, say, or from before the system was started anew, when a power cut
  /// may have lost some of its middle.
  std::string validator() const;
  /// The name of the whole file, when it has it already. Absent under the same conditions.
  std::optional<std::string> finishedName() const;

  /// Notes the validator, empty for none, the whole file's name and its size, where that is known.
  void note(const std::string& validator, const std::string& fileName,
            std::optional<std::uint64_t> size) const;
  /// Removes the note. There is to be none while a part may become another file's: the process can
  /// end at any moment.
  void removeNote() const;
  /// Removes part and note.
  void remove() const;

  /// Removes all parts and notes of the directory but those of the parts with the names.
  static void removeAllBut(const std::set<std::string>& names, const platform::Directory& directory,
                           const std::string& path);

 private:
  std::string noteBeginning() const;
  std::vector<std::string> noted() const;

  const platform::Directory& directory_;
  std::string path_;
  std::string file_;  // what the part is of: the URL, the title and the uuid
  std::string name_;
  std::string noteName_;
};
