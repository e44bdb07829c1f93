#pragma once

namespace platform {

/// For the sources of this folder that use ICU, which crashes, hangs or quietly falls back on
/// something else (the local zone, the root locale) where it gets no memory.
///
/// So it is never told: what the system refuses comes from a reserve, and the work that ICU did
/// with it then counts as failed.

/// Gives ICU its memory from here on. Throws std::bad_alloc when there is none for the reserve.
void prepareICUMemory();

/// Throws std::bad_alloc when the system has refused ICU memory since the last call.
void requireICUMemory();

/// The result of work with ICU that had all the memory it asked for; throws std::bad_alloc
/// otherwise.
template <typename Work>
auto usingICU(Work work) {
  prepareICUMemory();
  auto result = work();
  requireICUMemory();
  return result;
}

}  // namespace platform
