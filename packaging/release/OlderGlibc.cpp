// The static libraries of a distribution are made for its own C library, and call two functions
// that older ones do not have. With these in their place a release asks for glibc 2.34 and not
// for 2.36.

#include <dlfcn.h>
#include <link.h>
#include <sys/random.h>

#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <span>

// They replace what is declared so, for this program alone and not for what it loads.
// NOLINTBEGIN(bugprone-reserved-identifier,readability-identifier-naming)
// NOLINTBEGIN(readability-inconsistent-declaration-parameter-name)
#pragma GCC visibility push(hidden)
extern "C" {

/// Of glibc 2.36; expat takes the salt of its hash tables from it.
void arc4random_buf(void* buffer, std::size_t size) noexcept {
  auto* next = static_cast<unsigned char*>(buffer);
  while (size > 0) {
    const ssize_t length = ::getrandom(next, size, 0);
    if (length < 0 && errno != EINTR) std::abort();  // as glibc does: it has no way to fail
    if (length <= 0) continue;
    next += length;
    size -= static_cast<std::size_t>(length);
  }
}

/// Of glibc 2.35; libgcc finds the handlers of an exception by it, and of the result reads only
/// where the frames of the object that holds the address are described.
int _dl_find_object(void* address, dl_find_object* result) noexcept {
  struct Search {
    std::uintptr_t address;
    dl_find_object* result;
  } search{reinterpret_cast<std::uintptr_t>(address), result};
  const auto visit = [](dl_phdr_info* object, std::size_t, void* data) -> int {
    const auto* const wanted = static_cast<const Search*>(data);
    bool holdsAddress = false;
    std::uintptr_t frames = 0;
    for (const ElfW(Phdr) & segment : std::span(object->dlpi_phdr, object->dlpi_phnum)) {
      const std::uintptr_t begin = object->dlpi_addr + segment.p_vaddr;
      if (segment.p_type == PT_GNU_EH_FRAME) frames = begin;
      if (segment.p_type == PT_LOAD && wanted->address - begin < segment.p_memsz) {
        holdsAddress = true;
      }
    }
    if (!holdsAddress || frames == 0) return 0;
    *wanted->result = {};
    // NOLINTNEXTLINE(performance-no-int-to-ptr): addresses are numbers here
    wanted->result->dlfo_eh_frame = reinterpret_cast<void*>(frames);
    return 1;
  };
  return ::dl_iterate_phdr(visit, &search) == 1 ? 0 : -1;
}

}  // extern "C"
#pragma GCC visibility pop
// NOLINTEND(readability-inconsistent-declaration-parameter-name)
// NOLINTEND(bugprone-reserved-identifier,readability-identifier-naming)
