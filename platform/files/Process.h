#pragma once

namespace platform {

/// Prepares the process for its run; called once, first thing.
///
/// A closed pipe and a file beyond the limit on its size (ulimit -f) become failed writes instead
/// of signals that end the process. The descriptors of the three standard streams are opened on
/// nothing where the caller closed them, so that no file of ours is ever taken for one of them.
/// Memory that is freed stays with the process, whose next stage soon asks for it again.
///
/// Memory that runs out ends the process, wherever that happens: what was printed to standard
/// output is flushed, standard error is told "Out of memory.", the temporary files are removed, and
/// the exit status is 1. So nobody who asks for memory need think of a refusal. It is the one
/// message that does not come from the driver: nothing is left to carry it there.
void prepareProcess();

}  // namespace platform
