#pragma once

namespace platform {

/// Prepares the process for its run; called once, first thing.
///
/// A closed pipe and a file beyond the limit on its size (ulimit -f) become failed writes instead
/// of signals that end the process. The descriptors of the three standard streams are opened on
/// nothing where the caller closed them, so that no file of ours is ever taken for one of them;
/// where that cannot be done, standard error is told, and the exit status is 1.
/// Memory that is freed stays with the process, whose next stage soon asks for it again.
///
/// Memory that runs out ends the process, wherever that happens: what was printed to standard
/// output is flushed, standard error is told "Out of memory.", the temporary files are removed, and
/// the exit status is 1. So nobody who asks for memory need think of a refusal.
///
/// These two are the only messages that do not come from the driver.
void prepareProcess();

}  // namespace platform
