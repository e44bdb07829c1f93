// Runs the program that it is preloaded into again and again, each time in a new process that
// begins at main, with the faults that were asked for. So a run costs a fork, and not the loading
// and linking of a dozen libraries; and no fault hits the loader.
//
// The environment variable QEL_FAULT_SERVER holds the descriptors of two pipes, "REQUESTS,ANSWERS".
// A request is a line of five fields between tabs: the plan (FaultPlan.h), then the paths of
// standard input, standard output, standard error and of the log (RunLog.h). The answer is a line
// with the wait status of the run. The end of the requests ends the program. Without the variable
// it runs as ever.

#include <dlfcn.h>
#include <fcntl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <charconv>
#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string_view>

#include "tests/faults/FaultPlan.h"
#include "tests/faults/RawSystemCall.h"
#include "tests/faults/RunLog.h"
#include "tests/faults/SystemCallFaults.h"
#ifdef QEL_ALLOCATION_FAULTS
#include "tests/faults/AllocationFaults.h"
#endif

namespace {

using Main = int (*)(int, char**, char**);

constexpr unsigned kLongestRun = 60;  // seconds
constexpr int kSetupFailure = 98;
constexpr int kDescriptors = 256;

Main programMain = nullptr;
int requests = -1;
int answers = -1;
FaultPlan plan;
std::array<bool, kDescriptors> wasOpen;

bool isOpen(int descriptor) {
  return rawSystemCall(SYS_fcntl, descriptor, F_GETFD) >= 0;
}

void reportEnd() {
  if (RunLog::descriptor() < 0) return;
  for (int descriptor = 0; descriptor < kDescriptors; ++descriptor) {
    if (!isOpen(descriptor) || wasOpen[static_cast<std::size_t>(descriptor)]) continue;
    std::array<char, 8> digits{};
    std::to_chars(digits.data(), digits.data() + digits.size(), descriptor);
    RunLog::line({"leak", digits.data()});
  }
  std::array<char, 24> allocations{};
#ifdef QEL_ALLOCATION_FAULTS
  std::to_chars(allocations.data(), allocations.data() + allocations.size(),
                AllocationFaults::end());
#endif
  RunLog::line({"end", allocations.data()});
}

[[noreturn]] void failToSetUp(const char* what) {
  std::perror(what);
  ::_exit(kSetupFailure);
}

void reopen(int descriptor, const char* path, int flags) {
  const int opened = ::open(path, flags, 0666);
  if (opened < 0 || ::dup2(opened, descriptor) < 0 || ::close(opened) != 0) failToSetUp(path);
}

/// The next request's fields, each with a NUL behind it; false at the end of the requests.
bool readRequest(std::array<char*, 5>& fields) {
  static std::array<char, 8192> text;
  std::size_t length = 0;
  while (length < text.size() && ::read(requests, &text[length], 1) == 1) {
    if (text[length++] != '\n') continue;
    text[length - 1] = '\0';
    char* next = text.data();
    for (char*& field : fields) {
      if (next == nullptr) failToSetUp("a request with too few fields");
      field = next;
      next = std::strchr(next, '\t');
      if (next != nullptr) *next++ = '\0';
    }
    return true;
  }
  return false;
}

int runProgram(const std::array<char*, 5>& request, int count, char** arguments,
               char** environment) {
  ::close(requests);
  ::close(answers);
  ::alarm(kLongestRun);
  const auto& [planText, input, output, errors, log] = request;
  reopen(STDIN_FILENO, input, O_RDONLY);
  reopen(STDOUT_FILENO, output, O_WRONLY | O_CREAT | O_TRUNC);
  reopen(STDERR_FILENO, errors, O_WRONLY | O_CREAT | O_TRUNC);
  for (int descriptor = 0; descriptor < kDescriptors; ++descriptor) {
    wasOpen[static_cast<std::size_t>(descriptor)] = isOpen(descriptor);
  }
  if (!plan.parse(planText)) failToSetUp("the plan");
  if (!RunLog::open(log)) failToSetUp("the log");
  // Registered before anything of the program is: what it closes at its end is closed by then.
  if (!SystemCallFaults::begin(plan)) failToSetUp("the trap for system calls");
#ifdef QEL_ALLOCATION_FAULTS
  AllocationFaults::begin(plan);
#endif
  return programMain(count, arguments, environment);
}

int serve(int count, char** arguments, char** environment) {
  std::array<char*, 5> request{};
  while (readRequest(request)) {
    const pid_t child = ::fork();
    if (child < 0) failToSetUp("fork");
    if (child == 0) return runProgram(request, count, arguments, environment);
    int status = 0;
    while (::waitpid(child, &status, 0) < 0 && errno == EINTR) {
    }
    if (::dprintf(answers, "%d\n", status) < 0) break;
  }
  ::_exit(0);
}

__attribute__((constructor)) void registerEnd() {
  if (std::getenv("QEL_FAULT_SERVER") != nullptr) std::atexit(&reportEnd);
}

}  // namespace

// NOLINTNEXTLINE(bugprone-reserved-identifier,readability-identifier-naming)
extern "C" __attribute__((visibility("default"))) int __libc_start_main(
    Main main, int count, char** arguments, void (*initialise)(), void (*finish)(),
    void (*finishLoader)(), void* stackEnd) {
  using Start = int (*)(Main, int, char**, void (*)(), void (*)(), void (*)(), void*);
  const auto start = reinterpret_cast<Start>(::dlsym(RTLD_NEXT, "__libc_start_main"));
  const char* const pipes = std::getenv("QEL_FAULT_SERVER");
  programMain = main;
  if (pipes != nullptr && std::sscanf(pipes, "%d,%d", &requests, &answers) == 2) main = &serve;
  return start(main, count, arguments, initialise, finish, finishLoader, stackEnd);
}
