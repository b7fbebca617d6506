// ptrace.c: LD_PRELOAD library for user-mode Linux on processors whose registers need more room than it has.
//
// The kernel of Debian 12 keeps 2,696 bytes of a process's extended registers (NT_X86_XSTATE in ptrace(2)), which is all
// of them up to AVX-512. With AMX there are more, and Linux refuses to write fewer than there are, so that the guest ends
// at its start ("ptrace set fp regs failed"). What the kernel writes is completed with the present state here.
#define _GNU_SOURCE
#include <dlfcn.h>
#include <elf.h>
#include <stdarg.h>
#include <string.h>
#include <sys/ptrace.h>
#include <sys/types.h>
#include <sys/uio.h>

typedef long (*ptrace_function)(enum __ptrace_request, ...);

long ptrace(enum __ptrace_request request, ...) {
  // Not on the stack, which is a small one of the guest's kernel. The kernel has one thread that traces.
  static char state[32768] __attribute__((aligned(64)));
  static ptrace_function real;
  if (real == NULL) real = (ptrace_function)dlsym(RTLD_NEXT, "ptrace");

  va_list arguments;
  va_start(arguments, request);
  const pid_t process = va_arg(arguments, pid_t);
  void* const address = va_arg(arguments, void*);
  void* const data = va_arg(arguments, void*);
  va_end(arguments);

  if (request == PTRACE_SETREGSET && address == (void*)NT_X86_XSTATE) {
    const struct iovec* const given = data;
    struct iovec whole = {state, sizeof state};
    if (real(PTRACE_GETREGSET, process, address, &whole) == 0 && whole.iov_len > given->iov_len) {
      memcpy(state, given->iov_base, given->iov_len);
      return real(request, process, address, &whole);
    }
  }
  return real(request, process, address, data);
}
