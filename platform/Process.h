#pragma once

namespace platform {

/// Prepares the process for its run; called once, first thing.
///
/// A closed pipe becomes a failed write instead of a signal that ends the process. The descriptors
/// of the three standard streams are opened on nothing where the caller closed them, so that no
/// file of ours is ever taken for one of them.
void prepareProcess();

}  // namespace platform
