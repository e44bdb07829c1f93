#pragma once

namespace platform {

/// Runs the thread's event loop once: waits without a deadline until something happens on one of
/// the thread's downloads, and delivers the events that came of it, on this thread. False when the
/// loop has nothing to wait for.
bool runEventLoopOnce();

}  // namespace platform
