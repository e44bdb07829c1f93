#pragma once

#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <functional>
#include <span>

// The counters of a build that measures coverage, and how far from there they are really counted;
// all absent from other builds.
// NOLINTBEGIN(bugprone-reserved-identifier): the compiler names them
extern "C" char* __llvm_profile_begin_counters() __attribute__((weak));
extern "C" char* __llvm_profile_end_counters() __attribute__((weak));
extern "C" std::intptr_t __llvm_profile_counter_bias __attribute__((weak));
// NOLINTEND(bugprone-reserved-identifier)

/// What a forked child counts where coverage is measured: its parent takes it over, since a child
/// that ends by _exit or a signal writes no counts. In other builds it does nothing.
class CountsOfChild {
 public:
  CountsOfChild() {
    if (countersOfThisProcess().empty()) return;
    void* memory = ::mmap(nullptr, countersOfThisProcess().size(), PROT_READ | PROT_WRITE,
                          MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    if (memory == MAP_FAILED) return;
    shared_ = {static_cast<char*>(memory), countersOfThisProcess().size()};
    std::ranges::copy(countersOfThisProcess(), shared_.begin());
  }
  ~CountsOfChild() {
    if (!shared_.empty()) ::munmap(shared_.data(), shared_.size());
  }
  CountsOfChild(const CountsOfChild&) = delete;
  CountsOfChild& operator=(const CountsOfChild&) = delete;

  /// In the child: it goes on with its parent's counts, in memory that both see.
  void begin() const {
    if (!shared_.empty()) {
      __llvm_profile_counter_bias = shared_.data() - countersOfThisProcess().data();
    }
  }
  /// In the parent, once the child has ended.
  void takeOver() const {
    if (!shared_.empty()) std::ranges::copy(shared_, countersOfThisProcess().begin());
  }

 private:
  static std::span<char> countersOfThisProcess() {
    if (__llvm_profile_begin_counters == nullptr) return {};
    return {__llvm_profile_begin_counters(), __llvm_profile_end_counters()};
  }

  std::span<char> shared_;
};

/// Runs the function in a forked child, whose exit status is the function's result, and gives the
/// status that waitpid told. For what changes or ends a whole process.
inline int statusOfChild(const std::function<int()>& run) {
  std::fflush(stdout);  // or the child would print it again
  const CountsOfChild counts;
  const pid_t child = ::fork();
  if (child == 0) {
    counts.begin();
    ::_exit(run());
  }
  int status = -1;
  ::waitpid(child, &status, 0);
  counts.takeOver();
  return status;
}

/// The exit status of such a child; -1 when a signal ended it.
inline int exitStatusOfChild(const std::function<int()>& run) {
  const int status = statusOfChild(run);
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

/// Whether the condition holds in such a child.
inline bool holdsInChild(const std::function<bool()>& condition) {
  return exitStatusOfChild([&] { return condition() ? 0 : 1; }) == 0;
}
