#include "injected_failures.h"

#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstddef>
#include <stdexcept>

namespace {

// Resumes a stopped child until its next stop. Returns false if the child has ended.
bool Continue(pid_t child) {
  int status = 0;
  if (ptrace(PTRACE_SYSCALL, child, 0, 0) != 0) throw std::runtime_error("ptrace is not allowed");
  if (waitpid(child, &status, 0) != child) throw std::runtime_error("the child is lost");
  return WIFSTOPPED(status);
}

// Starts a child that stops before it runs `body`, and exits with its result.
pid_t Trace(const std::function<int()>& body) {
  const pid_t child = fork();
  if (child < 0) throw std::runtime_error("cannot fork");
  if (child == 0) {
    if (ptrace(PTRACE_TRACEME, 0, 0, 0) != 0 || raise(SIGSTOP) != 0) _exit(1);
    _exit(body());
  }
  int status = 0;
  if (waitpid(child, &status, 0) != child || !WIFSTOPPED(status)) throw std::runtime_error("ptrace is not allowed");
  return child;
}

// Resumes the child until its system call number `count`, from 0. Returns false if it ended before that.
bool ReachSystemCall(int count, pid_t child) {
  // Each call stops twice, at its entry and its exit; the first stop here is an exit or an entry of
  // raise(3), which costs a few calls at the beginning and changes nothing.
  for (int stop = 0; stop <= 2 * count; ++stop) {
    if (!Continue(child)) return false;
  }
  return true;
}

}  // namespace

bool FailSystemCall(long number, int error_number) {
  sock_filter steps[] = {
      BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
      BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, static_cast<unsigned>(number), 0, 1),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | static_cast<unsigned>(error_number)),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW),
  };
  const sock_fprog filter{sizeof steps / sizeof *steps, steps};
  return prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 && prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &filter) == 0;
}

bool RunUntilSystemCall(int count, const std::function<void()>& body) {
  const pid_t child = Trace([&] {
    body();
    return 0;
  });
  if (!ReachSystemCall(count, child)) return true;
  int status = 0;
  kill(child, SIGKILL);
  waitpid(child, &status, 0);
  return false;
}

std::optional<int> InterruptAtSystemCall(int count, const std::function<int()>& body,
                                         const std::function<void()>& meanwhile) {
  const pid_t child = Trace(body);
  if (!ReachSystemCall(count, child)) return std::nullopt;
  meanwhile();
  int status = 0;
  if (ptrace(PTRACE_DETACH, child, 0, 0) != 0 || waitpid(child, &status, 0) != child || !WIFEXITED(status)) {
    throw std::runtime_error("the child is lost");
  }
  return WEXITSTATUS(status);
}
