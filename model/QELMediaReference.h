#pragma once

#include <optional>
#include <utility>

#include "cli/common/QELReferenceType.h"
#include "platform/net/URL.h"
#include "platform/text/Text.h"

/// Where the media or the poster of a record lies: a file to copy or a URL to download.
///
/// Made once for each fetch, so that the URL after which the file is named (QELBundleNames.h) is
/// the one that is fetched (QELFetcher.h), and is parsed only once.
struct QELMediaReference {
  /// Exactly the reference type "remote" means a URL; any other and none mean a path.
  QELMediaReference(platform::OptionalText where, const platform::OptionalText& referenceType)
      : location(std::move(where)), isRemote(referenceType == kReferenceTypeRemote) {
    if (location && isRemote) url = platform::URL::parse(*location);
  }

  platform::OptionalText location;
  bool isRemote;
  std::optional<platform::URL> url;  // absent for a path, and for a remote location that is none
};
