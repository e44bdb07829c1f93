#include "platform/text/ICUMemory.h"

#include <malloc.h>
#include <unicode/uclean.h>

#include <algorithm>
#include <atomic>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <new>

namespace platform {

namespace {

/// Several times what the work that takes most of it, making a date formatter, asks for. Memory
/// that is not touched costs nothing but addresses.
constexpr std::size_t kReserveSize = std::size_t{8} << 20U;
constexpr std::size_t kAlignment = alignof(std::max_align_t);

std::atomic<bool> wasRefused;

/// Hands out memory that nobody gives back, each block behind its size.
class Reserve {
 public:
  void* take(std::size_t size) {
    const std::size_t rounded = (size + 2 * kAlignment - 1) / kAlignment * kAlignment;
    if (size > kReserveSize) return nullptr;
    const std::size_t begin = used_.fetch_add(rounded);
    if (begin + rounded > kReserveSize) return nullptr;
    char* const block = memory_ + begin + kAlignment;
    std::memcpy(block - kAlignment, &size, sizeof(size));
    return block;
  }

  bool holds(const void* block) const {
    const auto* const place = static_cast<const char*>(block);
    return place >= memory_ && place < memory_ + kReserveSize;
  }

  static std::size_t sizeOf(const void* block) {
    std::size_t size = 0;
    std::memcpy(&size, static_cast<const char*>(block) - kAlignment, sizeof(size));
    return size;
  }

 private:
  static char* newMemory() {
    void* const memory = std::malloc(kReserveSize);
    if (memory == nullptr) throw std::bad_alloc();
    return static_cast<char*>(memory);
  }

  char* const memory_ = newMemory();
  std::atomic<std::size_t> used_ = 0;
};

/// Never freed: ICU keeps what it has until the process ends.
Reserve& reserve() {
  static auto* const instance = new Reserve();
  return *instance;
}

void* takeFromReserve(std::size_t size) {
  wasRefused = true;
  return reserve().take(size);
}

void* U_CALLCONV allocate(const void* /*context*/, std::size_t size) {
  void* const block = std::malloc(size);
  return block != nullptr ? block : takeFromReserve(size);
}

void* U_CALLCONV reallocate(const void* /*context*/, void* block, std::size_t size) {
  const bool isReserved = block != nullptr && reserve().holds(block);
  if (!isReserved) {
    void* const larger = std::realloc(block, size);
    if (larger != nullptr) return larger;
  }
  // What a block of the system's holds is only known to be at least as large as what it was asked
  // for, so it is copied by its usable size.
  void* const moved = takeFromReserve(size);
  if (moved != nullptr && block != nullptr) {
    const std::size_t held = isReserved ? Reserve::sizeOf(block) : ::malloc_usable_size(block);
    std::memcpy(moved, block, std::min(held, size));
    if (!isReserved) std::free(block);
  }
  return moved;
}

void U_CALLCONV release(const void* /*context*/, void* block) {
  if (!reserve().holds(block)) std::free(block);
}

}  // namespace

void prepareICUMemory() {
  static const bool isPrepared = [] {
    reserve();
    UErrorCode status = U_ZERO_ERROR;
    u_setMemoryFunctions(nullptr, &allocate, &reallocate, &release, &status);
    return U_SUCCESS(status) != 0;
  }();
  static_cast<void>(isPrepared);
  wasRefused = false;  // the work that it was refused to may have failed for another reason
}

void requireICUMemory() {
  if (wasRefused.exchange(false)) throw std::bad_alloc();
}

}  // namespace platform
