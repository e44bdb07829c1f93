#include "model/QELMediaReference.h"

#include <utility>

#include "cli/common/QELReferenceType.h"

QELMediaReference::QELMediaReference(platform::OptionalText where,
                                     const platform::OptionalText& referenceType)
    : location(std::move(where)), isRemote(referenceType == kReferenceTypeRemote) {
  if (location && isRemote) url = platform::URL::parse(*location);
}
