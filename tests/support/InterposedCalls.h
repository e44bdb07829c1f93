#pragma once

#include <sys/stat.h>
#include <sys/types.h>

#include <cstddef>
#include <functional>
#include <utility>

/// Calls of the operating system that a test takes over for what cannot be brought about from
/// outside: another process that acts at the one moment that matters. Empty ones go to the system.
///
/// A function that is set answers as the call does, errno included. To be called by one thread.
struct InterposedCalls {
  std::function<ssize_t(std::size_t length)> copy_file_range;
  std::function<int(int descriptor, int operation)> flock;
  std::function<int(void* buffer, std::size_t length)> getentropy;
  std::function<int(int descriptor, struct stat* status)> fstat;
  std::function<int(const char* path, mode_t mode)> mkdir;
  std::function<int(int directory, const char* from, const char* to)> renameat;  // in one directory
  std::function<int(const char* path, struct stat* status)> stat;
};

/// Those that are in force. A test that sets one empties it again.
InterposedCalls& interposedCalls();

/// Sets one of them for a scope.
template <typename Function>
class Interposed {
 public:
  Interposed(std::function<Function> InterposedCalls::*call, std::function<Function> answer)
      : call_(call) {
    interposedCalls().*call_ = std::move(answer);
  }
  ~Interposed() { interposedCalls().*call_ = nullptr; }
  Interposed(const Interposed&) = delete;
  Interposed& operator=(const Interposed&) = delete;

 private:
  std::function<Function> InterposedCalls::*call_;
};
