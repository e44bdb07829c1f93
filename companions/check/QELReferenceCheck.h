#pragma once

#include <functional>

#include "companions/check/QELReferenceRecord.h"
#include "platform/text/ByteSource.h"

/// Reads a reference file as the tool does and tells what it refuses, ignores, or takes for
/// something else than was meant. Its podcast and then each of its episodes is handed on, for those
/// who look at more than keys and values.
void QELCheckReferenceFile(platform::ByteSource bytes, QELFindings& findings,
                           const std::function<void(const QELReferenceRecord&)>& receive);
