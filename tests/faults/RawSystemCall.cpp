#include "tests/faults/RawSystemCall.h"

// Aligned so that the code does not cross a boundary of 4 GiB: its addresses are compared by
// halves.
asm(R"(
  .pushsection .text
  .balign 64
  .globl qelRawSystemCall
  .hidden qelRawSystemCall
  .type qelRawSystemCall, @function
qelRawSystemCall:
  movq %rdi, %rax
  movq %rsi, %rdi
  movq %rdx, %rsi
  movq %rcx, %rdx
  movq %r8, %r10
  movq %r9, %r8
  movq 8(%rsp), %r9
  syscall
  ret
  .globl qelRawSystemCallEnd
  .hidden qelRawSystemCallEnd
qelRawSystemCallEnd:
  nop
  .size qelRawSystemCall, . - qelRawSystemCall
  .popsection
)");

extern "C" const char qelRawSystemCallEnd[];  // NOLINT(modernize-avoid-c-arrays): a place in code

std::uintptr_t rawSystemCallBegin() {
  return reinterpret_cast<std::uintptr_t>(&qelRawSystemCall);
}

std::uintptr_t rawSystemCallEnd() {
  return reinterpret_cast<std::uintptr_t>(&qelRawSystemCallEnd);
}
