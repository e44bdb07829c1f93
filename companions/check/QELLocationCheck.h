#pragma once

#include <string_view>

#include "companions/check/QELReferenceRecord.h"

/// Tells what is wrong with a location of a plain reference file ("EpisodeReference"), and with
/// what its type says that it is. Files are not looked for.
void QELCheckLocation(const QELReferenceRecord& record, std::string_view key,
                      QELFindings& findings);
