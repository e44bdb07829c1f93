#pragma once

#include "cli/common/QELDirectory.h"
#include "companions/common/QELFindings.h"
#include "platform/text/ByteSource.h"

/// Reads a feed as the tool does, with podcast-directory elements under the prefix of the
/// directory, and tells in numbers what is taken of it and what is not, and what is taken otherwise
/// than it looks. For publishing, it tells as well what readers and directories need and it lacks.
void QELCheckFeed(platform::ByteSource bytes, const QELDirectory& directory, bool isForPublishing,
                  QELFindings& findings);
