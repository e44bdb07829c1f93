#include "tests/faults/AllocationFaults.h"

#include <dlfcn.h>
#include <link.h>
#include <unwind.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "tests/faults/RunLog.h"

namespace {

FaultPlan* plan = nullptr;
unsigned long count = 0;
bool isLogging = false;

/// The callers of an allocation, as far as they are known: "libicuuc.so.72+0x1234 qel+0x99 ...".
class Callers {
 public:
  std::string_view text() {
    _Unwind_Backtrace(&Callers::add, this);
    return {text_.data(), length_};
  }

 private:
  static _Unwind_Reason_Code add(_Unwind_Context* context, void* self) {
    static_cast<Callers*>(self)->addAddress(_Unwind_GetIP(context));
    return _URC_NO_REASON;
  }

  void addAddress(std::uintptr_t address) {
    constexpr std::size_t kLongestEntry = 160;
    dl_find_object object{};
    if (length_ + kLongestEntry > text_.size() ||
        ::_dl_find_object(reinterpret_cast<void*>(address - 1), &object) != 0) {
      return;
    }
    std::string_view name(object.dlfo_link_map->l_name);
    if (name.empty()) name = "qel";
    name = name.substr(name.rfind('/') + 1).substr(0, kLongestEntry / 2);
    if (name.starts_with("libqel_faults")) return;
    length_ += name.copy(text_.data() + length_, name.size());
    text_[length_++] = '+';
    length_ =
        static_cast<std::size_t>(std::to_chars(text_.data() + length_, text_.data() + text_.size(),
                                               address - object.dlfo_link_map->l_addr, 16)
                                     .ptr -
                                 text_.data());
    text_[length_++] = ' ';
  }

  std::array<char, 1500> text_;
  std::size_t length_ = 0;
};

bool isRefused() {
  if (plan == nullptr || isLogging) return false;
  ++count;
  const int outcome = plan->judge("malloc");
  if (outcome <= FaultPlan::kPass) return false;
  isLogging = true;
  RunLog::line({"fault", "malloc", "-", FaultPlan::nameOfError(outcome)});
  RunLog::line({"frames", Callers().text()});
  isLogging = false;
  errno = ENOMEM;
  return true;
}

}  // namespace

void AllocationFaults::begin(FaultPlan& faults) {
  plan = &faults;
}

unsigned long AllocationFaults::end() {
  plan = nullptr;
  return count;
}

// The C library's own functions under their second names: looking up the first ones would allocate.
// NOLINTBEGIN(bugprone-reserved-identifier,readability-*)
extern "C" {
void* __libc_malloc(std::size_t size);
void* __libc_calloc(std::size_t count, std::size_t size);
void* __libc_realloc(void* block, std::size_t size);
void* __libc_memalign(std::size_t alignment, std::size_t size);

__attribute__((visibility("default"))) void* malloc(std::size_t size) {
  return isRefused() ? nullptr : __libc_malloc(size);
}

__attribute__((visibility("default"))) void* calloc(std::size_t members, std::size_t size) {
  return isRefused() ? nullptr : __libc_calloc(members, size);
}

__attribute__((visibility("default"))) void* realloc(void* block, std::size_t size) {
  return isRefused() ? nullptr : __libc_realloc(block, size);
}

__attribute__((visibility("default"))) void* aligned_alloc(std::size_t alignment,
                                                           std::size_t size) {
  return isRefused() ? nullptr : __libc_memalign(alignment, size);
}

__attribute__((visibility("default"))) void* memalign(std::size_t alignment, std::size_t size) {
  return isRefused() ? nullptr : __libc_memalign(alignment, size);
}

__attribute__((visibility("default"))) int posix_memalign(void** block, std::size_t alignment,
                                                          std::size_t size) {
  void* made = isRefused() ? nullptr : __libc_memalign(alignment, size);
  if (made == nullptr) return ENOMEM;
  *block = made;
  return 0;
}
}
// NOLINTEND(bugprone-reserved-identifier,readability-*)
