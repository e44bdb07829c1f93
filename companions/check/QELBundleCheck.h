#pragma once

#include <map>
#include <set>
#include <string>
#include <string_view>
#include <utility>

#include "companions/check/QELReferenceRecord.h"
#include "platform/text/ByteSource.h"

/// Tells what is wrong with a bundle: its reference file, whose locations are all taken for paths
/// inside of it, the files that this lists, and the files that are there.
class QELBundleCheck {
 public:
  QELBundleCheck(std::string directory, bool isForPublishing, QELFindings& findings)
      : directory_(std::move(directory)), isForPublishing_(isForPublishing), findings_(findings) {}

  /// Of the bytes of its "Info.plist".
  void check(platform::ByteSource bytes);

 private:
  void checkListed(const QELReferenceRecord& record, std::string_view key);
  void checkFile(const platform::PropertyListPart& location, const std::string& name,
                 const platform::PropertyListPart* size);
  void checkKept();
  void checkName(const std::string& name);

  std::string directory_;
  bool isForPublishing_;
  QELFindings& findings_;
  std::set<std::string> listed_;             // names below the directory
  std::map<std::string, std::string> kept_;  // names that are there, by themselves without case
};
