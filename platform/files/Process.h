#pragma once

namespace platform {

/// Prepares the process for its run; called once, first thing.
///
/// A closed pipe and a file beyond the limit on its size (ulimit -f) become failed writes instead
/// of signals that end the process. The descriptors of the three standard streams are opened on
/// nothing where the caller closed them, so that no file of ours is ever taken for one of them.
/// Memory that is freed stays with the process, whose next stage soon asks for it again.
void prepareProcess();

}  // namespace platform
