// Injects failing system calls, and kills a child process of a test at a chosen system call.
#ifndef VORN_TESTS_SUPPORT_LINUX_INJECTED_FAILURES_H
#define VORN_TESTS_SUPPORT_LINUX_INJECTED_FAILURES_H

#include <sys/syscall.h>

#include <functional>
#include <optional>

// From now on the system call `number` (SYS_…) of this process fails with `error_number`: seccomp(2).
// This cannot be undone. Returns false if the system does not allow it.
bool FailSystemCall(long number, int error_number);

// Runs `body` in a child process and kills it at its system call number `count` (from 0), before the
// call is made: ptrace(2). Returns true if the body ended before it made that many calls.
bool RunUntilSystemCall(int count, const std::function<void()>& body);

// Runs `body` in a child process, stops it at its system call number `count` while `meanwhile` runs here, and resumes
// it. Returns the result of `body`, from 0 to 255; nullopt if it ended before it made that many calls.
std::optional<int> InterruptAtSystemCall(int count, const std::function<int()>& body,
                                         const std::function<void()>& meanwhile);

#endif  // VORN_TESTS_SUPPORT_LINUX_INJECTED_FAILURES_H
