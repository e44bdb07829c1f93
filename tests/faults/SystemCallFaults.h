#pragma once

#include "tests/faults/FaultPlan.h"

/// Makes system calls of this process fail by a plan, whoever makes them: the tool, its libraries
/// or the C library inside of one of its functions.
///
/// Counted are the calls that concern the directory in which the run started (a path below it, or a
/// descriptor of such a file), the standard streams, sockets, and those that concern no file
/// (getrandom, poll). Each gets one line in the run's log.
class SystemCallFaults {
 public:
  /// From now on, until the process ends; the plan must outlive it. False where the kernel does not
  /// allow that.
  static bool begin(FaultPlan& faults);
};
