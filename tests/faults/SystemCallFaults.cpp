#include "tests/faults/SystemCallFaults.h"

#include <fcntl.h>
#include <linux/audit.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <ucontext.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <climits>
#include <csignal>
#include <cstddef>
#include <cstring>

#include "tests/faults/RawSystemCall.h"
#include "tests/faults/RunLog.h"

namespace {

constexpr int kNone = -1;

/// What a system call is called here, and where it has what.
struct Call {
  long number;
  std::string_view kind;
  int path = kNone;        // the argument that is its path
  int directory = kNone;   // the argument that the path is relative to
  int descriptor = kNone;  // the argument that is its descriptor
  int length = kNone;      // the argument that "short" makes smaller
};

constexpr auto kCalls = std::to_array<Call>({
    {.number = SYS_open, .kind = "open", .path = 0},
    {.number = SYS_openat, .kind = "open", .path = 1, .directory = 0},
    {.number = SYS_creat, .kind = "create", .path = 0},
    {.number = SYS_read, .kind = "read", .descriptor = 0, .length = 2},
    {.number = SYS_pread64, .kind = "read", .descriptor = 0, .length = 2},
    {.number = SYS_readv, .kind = "readv", .descriptor = 0},
    {.number = SYS_write, .kind = "write", .descriptor = 0, .length = 2},
    {.number = SYS_pwrite64, .kind = "write", .descriptor = 0, .length = 2},
    {.number = SYS_writev, .kind = "writev", .descriptor = 0},
    {.number = SYS_close, .kind = "close", .descriptor = 0},
    {.number = SYS_rename, .kind = "rename", .path = 1},
    {.number = SYS_renameat, .kind = "rename", .path = 3, .directory = 2},
    {.number = SYS_renameat2, .kind = "rename", .path = 3, .directory = 2},
    {.number = SYS_link, .kind = "link", .path = 1},
    {.number = SYS_linkat, .kind = "link", .path = 3, .directory = 2},
    {.number = SYS_symlink, .kind = "symlink", .path = 1},
    {.number = SYS_mkdir, .kind = "mkdir", .path = 0},
    {.number = SYS_mkdirat, .kind = "mkdir", .path = 1, .directory = 0},
    {.number = SYS_unlink, .kind = "unlink", .path = 0},
    {.number = SYS_unlinkat, .kind = "unlink", .path = 1, .directory = 0},
    {.number = SYS_rmdir, .kind = "unlink", .path = 0},
    {.number = SYS_stat, .kind = "stat", .path = 0},
    {.number = SYS_lstat, .kind = "lstat", .path = 0},
    {.number = SYS_fstat, .kind = "fstat", .descriptor = 0},
    {.number = SYS_newfstatat, .kind = "stat", .path = 1, .directory = 0},
    {.number = SYS_statx, .kind = "stat", .path = 1, .directory = 0},
    {.number = SYS_access, .kind = "access", .path = 0},
    {.number = SYS_faccessat, .kind = "access", .path = 1, .directory = 0},
    {.number = SYS_readlink, .kind = "readlink", .path = 0},
    {.number = SYS_readlinkat, .kind = "readlink", .path = 1, .directory = 0},
    {.number = SYS_chmod, .kind = "chmod", .path = 0},
    {.number = SYS_truncate, .kind = "truncate", .path = 0},
    {.number = SYS_getdents64, .kind = "getdents", .descriptor = 0},
    {.number = SYS_lseek, .kind = "lseek", .descriptor = 0},
    {.number = SYS_ftruncate, .kind = "ftruncate", .descriptor = 0},
    {.number = SYS_fallocate, .kind = "fallocate", .descriptor = 0},
    {.number = SYS_fchmod, .kind = "fchmod", .descriptor = 0},
    {.number = SYS_fsync, .kind = "fsync", .descriptor = 0},
    {.number = SYS_fdatasync, .kind = "fsync", .descriptor = 0},
    {.number = SYS_syncfs, .kind = "syncfs", .descriptor = 0},
    {.number = SYS_utimensat, .kind = "utimens", .path = 1, .directory = 0},
    {.number = SYS_fadvise64, .kind = "fadvise", .descriptor = 0},
    {.number = SYS_flock, .kind = "flock", .descriptor = 0},
    {.number = SYS_fcntl, .kind = "fcntl", .descriptor = 0},
    {.number = SYS_dup, .kind = "dup", .descriptor = 0},
    {.number = SYS_mmap, .kind = "mmap", .descriptor = 4},
    {.number = SYS_copy_file_range, .kind = "copy_file_range", .descriptor = 2, .length = 4},
    {.number = SYS_sendfile, .kind = "sendfile", .descriptor = 0, .length = 3},
    {.number = SYS_getcwd, .kind = "getcwd"},
    {.number = SYS_getrandom, .kind = "getrandom"},
    {.number = SYS_poll, .kind = "poll"},
    {.number = SYS_ppoll, .kind = "poll"},
    {.number = SYS_socket, .kind = "socket"},
    {.number = SYS_socketpair, .kind = "socketpair"},
    {.number = SYS_eventfd2, .kind = "eventfd"},
    {.number = SYS_connect, .kind = "connect", .descriptor = 0},
    {.number = SYS_sendto, .kind = "send", .descriptor = 0, .length = 2},
    {.number = SYS_recvfrom, .kind = "recv", .descriptor = 0, .length = 2},
    {.number = SYS_getsockopt, .kind = "getsockopt", .descriptor = 0},
    {.number = SYS_setsockopt, .kind = "setsockopt", .descriptor = 0},
    {.number = SYS_getsockname, .kind = "getsockname", .descriptor = 0},
    {.number = SYS_getpeername, .kind = "getpeername", .descriptor = 0},
    {.number = SYS_ioctl, .kind = "ioctl", .descriptor = 0},
});

using Arguments = std::array<long, 6>;
using Name = std::array<char, 512>;

constexpr std::size_t kDescriptors = 256;

FaultPlan* plan = nullptr;
Name root;
std::size_t rootLength = 0;
/// What each open descriptor was opened as; empty for one that does not count.
std::array<Name, kDescriptors> opened;

void setName(Name& name, std::string_view text) {
  name[text.copy(name.data(), name.size() - 1)] = '\0';
}

std::string_view nameOf(long descriptor) {
  if (descriptor < 0 || descriptor >= static_cast<long>(kDescriptors)) return {};
  return opened[static_cast<std::size_t>(descriptor)].data();
}

void setNameOf(long descriptor, std::string_view name) {
  if (descriptor < 0 || descriptor >= static_cast<long>(kDescriptors)) return;
  setName(opened[static_cast<std::size_t>(descriptor)], name);
}

/// The path as seen from the root; empty for one that leads elsewhere.
std::string_view pathInRoot(std::string_view path, long directory, Name& buffer) {
  if (path.starts_with('/')) {
    const std::string_view start(root.data(), rootLength);
    if (path == start) return ".";
    if (!path.starts_with(start) || path[start.size()] != '/') return {};
    return path.substr(start.size() + 1);
  }
  if (directory == AT_FDCWD) return path;
  const std::string_view parent = nameOf(directory);
  if (parent.empty()) return {};
  if (path.empty()) return parent;
  std::size_t length = parent.copy(buffer.data(), buffer.size() - 2);
  buffer[length++] = '/';
  length += path.copy(buffer.data() + length, buffer.size() - 1 - length);
  return {buffer.data(), length};
}

struct Subject {
  std::string_view kind;
  std::string_view name;
};

/// What a call does to what; no name when it does not count.
Subject subjectOf(const Call& call, const Arguments& arguments, Name& buffer) {
  const auto argument = [&](int index) { return arguments[static_cast<std::size_t>(index)]; };
  Subject subject{call.kind, {}};
  if (call.path != kNone) {
    const auto* text = reinterpret_cast<const char*>(argument(call.path));
    const std::string_view path = text != nullptr ? std::string_view(text) : std::string_view();
    const long directory =
        call.directory == kNone ? AT_FDCWD : static_cast<int>(argument(call.directory));
    subject.name = pathInRoot(path, directory, buffer);
    if (call.kind == "stat") {
      const long flags = call.number == SYS_newfstatat ? arguments[3]
                         : call.number == SYS_statx    ? arguments[2]
                                                       : 0;
      if (path.empty()) {
        subject.kind = "fstat";
      } else if ((flags & AT_SYMLINK_NOFOLLOW) != 0) {
        subject.kind = "lstat";
      }
    } else if (call.kind == "open") {
      const long flags = arguments[call.number == SYS_open ? 1 : 2];
      if ((flags & O_CREAT) != 0) {
        subject.kind = "create";
      } else if ((flags & O_DIRECTORY) != 0) {
        subject.kind = "opendir";
      } else if ((flags & O_ACCMODE) != O_RDONLY) {
        subject.kind = "reopen";
      }
    }
  } else if (call.descriptor != kNone) {
    subject.name = nameOf(argument(call.descriptor));
    const bool duplicates = arguments[1] == F_DUPFD || arguments[1] == F_DUPFD_CLOEXEC;
    if (call.kind == "fcntl" && duplicates) subject.kind = "dup";
    // This fails for one reason only, that there is no such descriptor.
    if (call.kind == "fcntl" && arguments[1] == F_GETFD) subject.name = {};
  } else {
    subject.name = "-";
  }
  return subject;
}

/// Keeps track of what the descriptors are after a call that was made.
void follow(const Call& call, const Subject& subject, const Arguments& arguments, long result) {
  if (call.kind == "close") setNameOf(arguments[0], {});
  if (result < 0) return;
  if (call.kind == "open" || call.kind == "create" || subject.kind == "dup") {
    Name name;  // the subject's may be that of the descriptor which is about to be named
    setName(name, subject.name);
    setNameOf(result, name.data());
  } else if (call.kind == "socket" || call.kind == "eventfd") {
    setNameOf(result, call.kind == "socket" ? "<socket>" : "<eventfd>");
  } else if (call.kind == "socketpair") {
    const auto* pair = reinterpret_cast<const int*>(arguments[3]);
    setNameOf(pair[0], "<pair>");
    setNameOf(pair[1], "<pair>");
  }
}

long perform(const Call& call, Arguments arguments) {
  Name buffer;
  const Subject subject = subjectOf(call, arguments, buffer);
  const auto make = [&] {
    const long result = rawSystemCall(call.number, arguments[0], arguments[1], arguments[2],
                                      arguments[3], arguments[4], arguments[5]);
    follow(call, subject, arguments, result);
    return result;
  };
  if (subject.name.empty()) return make();

  const int outcome = plan->judge(subject.kind);
  if (outcome == FaultPlan::kPass || (outcome == FaultPlan::kShort && call.length == kNone)) {
    RunLog::line({"call", subject.kind, subject.name});
    return make();
  }
  RunLog::line({"fault", subject.kind, subject.name, FaultPlan::nameOfError(outcome)});
  if (outcome == FaultPlan::kShort) {
    long& length = arguments[static_cast<std::size_t>(call.length)];
    constexpr long kFewBytes = 7;
    length = std::min(length, kFewBytes);
    return make();
  }
  // A descriptor is gone, whatever its closing says.
  if (call.kind == "close") make();
  return -outcome;
}

void handleTrap(int /*signal*/, siginfo_t* information, void* context) {
  auto& registers = static_cast<ucontext_t*>(context)->uc_mcontext.gregs;
  const long number = information->si_syscall;
  const auto* call = std::find_if(kCalls.begin(), kCalls.end(),
                                  [&](const Call& known) { return known.number == number; });
  registers[REG_RAX] = perform(*call, {registers[REG_RDI], registers[REG_RSI], registers[REG_RDX],
                                       registers[REG_R10], registers[REG_R8], registers[REG_R9]});
}

bool trapCalls() {
  constexpr unsigned kJumpEqual = BPF_JMP | BPF_JEQ | BPF_K;
  constexpr unsigned kJumpAtLeast = BPF_JMP | BPF_JGE | BPF_K;
  constexpr unsigned kLoad = BPF_LD | BPF_W | BPF_ABS;
  constexpr unsigned kReturn = BPF_RET | BPF_K;
  constexpr unsigned kInstructionPointer = offsetof(seccomp_data, instruction_pointer);
  const std::uint64_t begin = rawSystemCallBegin();
  const std::uint64_t end = rawSystemCallEnd();

  std::array<sock_filter, kCalls.size() + 16> filter;
  std::size_t length = 0;
  const auto add = [&](unsigned code, std::uint64_t operand, std::size_t ifTrue = 0,
                       std::size_t ifFalse = 0) {
    filter[length++] = {static_cast<__u16>(code), static_cast<__u8>(ifTrue),
                        static_cast<__u8>(ifFalse), static_cast<__u32>(operand)};
  };
  add(kLoad, offsetof(seccomp_data, arch));
  add(kJumpEqual, AUDIT_ARCH_X86_64, 1, 0);
  add(kReturn, SECCOMP_RET_ALLOW);
  // The calls of the handler itself pass.
  add(kLoad, kInstructionPointer + 4);
  add(kJumpEqual, begin >> 32U, 0, 4);
  add(kLoad, kInstructionPointer);
  add(kJumpAtLeast, begin & 0xFFFFFFFFU, 0, 2);
  add(kJumpAtLeast, (end & 0xFFFFFFFFU) + 1, 1, 0);
  add(kReturn, SECCOMP_RET_ALLOW);
  add(kLoad, offsetof(seccomp_data, nr));
  for (std::size_t index = 0; index < kCalls.size(); ++index) {
    add(kJumpEqual, static_cast<std::uint64_t>(kCalls[index].number), kCalls.size() - index);
  }
  add(kReturn, SECCOMP_RET_ALLOW);
  add(kReturn, SECCOMP_RET_TRAP);
  static_assert(kCalls.size() < UCHAR_MAX);

  const sock_fprog program{static_cast<unsigned short>(length), filter.data()};
  return ::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
         ::prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) == 0;
}

}  // namespace

bool SystemCallFaults::begin(FaultPlan& faults) {
  plan = &faults;
  if (::getcwd(root.data(), root.size()) == nullptr) return false;
  rootLength = std::strlen(root.data());
  setNameOf(STDIN_FILENO, "<stdin>");
  setNameOf(STDOUT_FILENO, "<stdout>");
  setNameOf(STDERR_FILENO, "<stderr>");

  struct sigaction action {};
  action.sa_sigaction = &handleTrap;
  action.sa_flags = SA_SIGINFO | SA_NODEFER;
  return ::sigaction(SIGSYS, &action, nullptr) == 0 && trapCalls();
}
