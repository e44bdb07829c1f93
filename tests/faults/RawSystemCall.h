#pragma once

#include <cstdint>

/// A system call that is never made to fail and never counted. The result is the kernel's: negative
/// errno values stand for failures.
extern "C" long qelRawSystemCall(long number, long first, long second, long third, long fourth,
                                 long fifth, long sixth);

inline long rawSystemCall(long number, long first = 0, long second = 0, long third = 0,
                          long fourth = 0, long fifth = 0, long sixth = 0) {
  return qelRawSystemCall(number, first, second, third, fourth, fifth, sixth);
}

/// The code addresses that such a call can come from: behind the first, up to the last.
std::uintptr_t rawSystemCallBegin();
std::uintptr_t rawSystemCallEnd();
