// Failing system calls and deaths at any moment, for a child process of a test.
#ifndef VORN_TESTS_SUPPORT_LINUX_INJECTED_FAILURES_H
#define VORN_TESTS_SUPPORT_LINUX_INJECTED_FAILURES_H

#include <sys/syscall.h>

#include <functional>
#include <optional>

// From now on the system call `number` (SYS_…) of this process fails with `error_number`: seccomp(2).
// There is no way back. False when the system does not allow it.
bool FailSystemCall(long number, int error_number);

// Runs `body` in a child process and kills it at its system call number `count` (from 0), before the
// call is made: ptrace(2). True when the body ended before it made that many.
bool RunUntilSystemCall(int count, const std::function<void()>& body);

// Runs `body` in a child process, holds it at its system call number `count` while `meanwhile` runs here, and lets it
// go on. The result of `body`, from 0 to 255; none when it ended before it made that many calls.
std::optional<int> InterruptAtSystemCall(int count, const std::function<int()>& body,
                                         const std::function<void()>& meanwhile);

#endif  // VORN_TESTS_SUPPORT_LINUX_INJECTED_FAILURES_H
