#pragma once

#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <functional>

/// Runs the function in a forked child, whose exit status is the function's result, and gives the
/// status that waitpid told. For what changes or ends a whole process.
inline int statusOfChild(const std::function<int()>& run) {
  std::fflush(stdout);  // or the child would print it again
  const pid_t child = ::fork();
  if (child == 0) {
    ::_exit(run());
  }
  int status = -1;
  ::waitpid(child, &status, 0);
  return status;
}

/// The exit status of such a child; -1 when a signal ended it.
inline int exitStatusOfChild(const std::function<int()>& run) {
  const int status = statusOfChild(run);
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}
