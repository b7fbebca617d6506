#ifndef VORN_TESTS_SUPPORT_LINUX_FILE_LOCK_WAITERS_H
#define VORN_TESTS_SUPPORT_LINUX_FILE_LOCK_WAITERS_H

#include <string>

// Returns whether a process is blocked until the lock (flock(2)) of the file at `path` is free.
bool HasLockWaiter(const std::string& path);

#endif  // VORN_TESTS_SUPPORT_LINUX_FILE_LOCK_WAITERS_H
