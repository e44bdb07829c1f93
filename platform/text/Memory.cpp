#include "platform/text/Memory.h"

#include <unicode/uclean.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <new>

namespace platform {
namespace {

template <typename Request>
void* insist(Request request) {
  void* block = request();
  while (block == nullptr) {
    const std::new_handler handler = std::get_new_handler();
    if (handler == nullptr) return nullptr;
    handler();
    block = request();
  }
  return block;
}

/// malloc(0) may give a null pointer without having failed, so one byte at least is asked for.
std::size_t atLeastOne(std::size_t size) {
  return std::max<std::size_t>(size, 1);
}

}  // namespace

void* Memory::allocate(std::size_t size) {
  return insist([=] { return std::malloc(atLeastOne(size)); });
}

void* Memory::allocateZeroed(std::size_t count, std::size_t size) {
  return insist([=] { return std::calloc(atLeastOne(count), atLeastOne(size)); });
}

void* Memory::reallocate(void* block, std::size_t size) {
  // A block that realloc refuses to move is still there: g++ would take the next try for a use
  // after free.
  void* volatile kept = block;
  return insist([&] { return std::realloc(kept, atLeastOne(size)); });
}

char* Memory::duplicate(const char* text) {
  return static_cast<char*>(insist([=] { return ::strdup(text); }));
}

void Memory::release(void* block) {
  std::free(block);
}

void Memory::serveICU() {
  UErrorCode status = U_ZERO_ERROR;
  u_setMemoryFunctions(
      nullptr, [](const void*, std::size_t size) { return allocate(size); },
      [](const void*, void* block, std::size_t size) { return reallocate(block, size); },
      [](const void*, void* block) { release(block); }, &status);
}

}  // namespace platform
