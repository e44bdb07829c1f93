#pragma once

#include <cstddef>

namespace platform {

/// Memory for the libraries that would otherwise ask the C library for theirs.
///
/// Where there is none left, it does what operator new does: it calls the new-handler, which ends
/// the process (see prepareProcess). So no library is ever told, and none falls back on a simpler
/// result (ICU takes another zone or locale then, or crashes). In a process without a new-handler,
/// a test or a fuzz target, the library gets the null pointer that malloc would have given it.
class Memory {
 public:
  static void* allocate(std::size_t size);
  static void* allocateZeroed(std::size_t count, std::size_t size);
  static void* reallocate(void* block, std::size_t size);
  static char* duplicate(const char* text);
  static void release(void* block);

  /// Gives ICU, which has one source of memory for the whole process, this one. To be called before
  /// its first use; without it, ICU uses the C library's.
  static void serveICU();
};

}  // namespace platform
