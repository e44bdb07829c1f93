#pragma once

#include "companions/check/QELReferenceRecord.h"

/// Tells what readers and directories need of a podcast or an episode, and the record lacks. What
/// qel-publish adds by itself is not told: guids, and of a bundle's files lengths, types and URLs.
void QELCheckForPublishing(const QELReferenceRecord& record, QELFindings& findings,
                           bool isInBundle = false);
