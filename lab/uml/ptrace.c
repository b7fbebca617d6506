// ptrace.c: ptrace(2) for user-mode Linux on processors whose registers need more room than it has.
//
// The kernels of Debian 12 and 13 keep 2,696 bytes of a process's extended registers (NT_X86_XSTATE in ptrace(2)), which
// is all of them up to AVX-512. With AMX there are more, and Linux refuses to write fewer than there are, so that the guest
// ends at its start ("ptrace set fp regs failed"). What the kernel writes is completed with the present state here.
//
// A kernel that is linked dynamically gets this function as an LD_PRELOAD library; into a static one it is linked.
#define _GNU_SOURCE
#include <elf.h>
#include <stdarg.h>
#include <string.h>
#include <sys/ptrace.h>
#include <sys/syscall.h>
#include <sys/types.h>
#include <sys/uio.h>
#include <unistd.h>

// The C library's ptrace(): the requests that read a word return it.
static long call(enum __ptrace_request request, pid_t process, void* address, void* data) {
  if (request != PTRACE_PEEKTEXT && request != PTRACE_PEEKDATA && request != PTRACE_PEEKUSER)
    return syscall(SYS_ptrace, request, process, address, data);
  long word;
  return syscall(SYS_ptrace, request, process, address, &word) < 0 ? -1 : word;
}

long ptrace(enum __ptrace_request request, ...) {
  // Not on the stack, which is a small one of the guest's kernel. The kernel has one thread that traces.
  static char state[32768] __attribute__((aligned(64)));

  va_list arguments;
  va_start(arguments, request);
  const pid_t process = va_arg(arguments, pid_t);
  void* const address = va_arg(arguments, void*);
  void* const data = va_arg(arguments, void*);
  va_end(arguments);

  if (request == PTRACE_SETREGSET && address == (void*)NT_X86_XSTATE) {
    const struct iovec* const given = data;
    struct iovec whole = {state, sizeof state};
    if (call(PTRACE_GETREGSET, process, address, &whole) == 0 && whole.iov_len > given->iov_len) {
      memcpy(state, given->iov_base, given->iov_len);
      return call(request, process, address, &whole);
    }
  }
  return call(request, process, address, data);
}
