#pragma once

#include "tests/faults/FaultPlan.h"

/// Makes allocations of this process fail by a plan, whoever asks for them: operator new, the
/// libraries, the C library itself. Their kind is "malloc", and only one that fails is logged.
class AllocationFaults {
 public:
  /// From now on, until `end`; the plan must outlive it.
  static void begin(FaultPlan& faults);
  /// The number of allocations since `begin`.
  static unsigned long end();
};
