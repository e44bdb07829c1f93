#pragma once

#include <string>

#include "companions/common/QELCommandLine.h"
#include "companions/common/QELTransferDisplay.h"
#include "companions/keep/QELKeptShow.h"
#include "companions/transfers/QELTransfers.h"
#include "generators/QELBundleDirectory.h"
#include "platform/plist/PropertyListValue.h"

/// The part of a run that has its show up to date with the source: fetches what is to be fetched,
/// writes the reference file now and then and in the end, and tells what came of it.
class QELKeepRun {
 public:
  /// `kept` is the reference dictionary that the bundle has on the disk.
  QELKeepRun(const QELCommandLine& commandLine, QELKeptShow& show, platform::Dictionary kept,
             bool isQuiet);

  /// Tells what would be fetched.
  int rehearse();
  /// The exit status. SIGINT, SIGTERM and SIGHUP end the run early, and then the process.
  int fetch(QELBundleDirectory& directory, QELTransfers transfers);

 private:
  void say(const std::string& line);
  bool write(QELBundleDirectory& directory);
  int conclude(bool isWritten);

  const QELCommandLine& commandLine_;
  QELKeptShow& show_;
  platform::Dictionary written_;
  bool isQuiet_;
  QELTransferDisplay display_;
};
