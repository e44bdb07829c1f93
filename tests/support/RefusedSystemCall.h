#pragma once

#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/syscall.h>

#include <array>
#include <cstddef>

/// What poll calls; newer processors never had a call of that name.
#ifdef SYS_poll
inline constexpr long kPollCall = SYS_poll;
#else
inline constexpr long kPollCall = SYS_ppoll;
#endif

/// Whether system calls can be refused here. An emulator of another processor needs them all.
inline bool canRefuseSystemCalls() {
  return ::prctl(PR_GET_SECCOMP) >= 0;
}
inline constexpr const char* kCannotRefuse = "system calls cannot be refused here";

/// Makes a system call fail with the given errno for the rest of this process, as a file system or
/// kernel without it would. False where the kernel does not allow that.
inline bool refuseSystemCall(long number, int failure) {
  std::array<sock_filter, 4> filter{{
      BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
      BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, static_cast<unsigned>(number), 0, 1),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | static_cast<unsigned>(failure)),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW),
  }};
  const sock_fprog program{filter.size(), filter.data()};
  return ::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
         ::prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) == 0;
}
