// A lock that excludes other threads and other processes alike.
#ifndef VORN_LINUX_SYSTEM_FILE_LOCK_H
#define VORN_LINUX_SYSTEM_FILE_LOCK_H

#include <chrono>
#include <string>
#include <string_view>

#include "file_descriptor.h"
#include "root.h"
#include "status.h"

namespace vorn {

// Waits for the exclusive lock (flock(2)) on the file at `path` below the root; the file is created if
// it is missing. The caller owns the lock until it closes the descriptor; the kernel releases it when
// the process dies. Fails with kLockTimeout when another owner keeps the lock for longer than `limit`.
Result<FileDescriptor> TakeFileLock(const Root& root, std::string_view path, std::chrono::milliseconds limit);

// The same for an open file, which `name` names in a failure. The file stays locked until it is closed.
Status LockFile(const FileDescriptor& file, const std::string& name, std::chrono::milliseconds limit);

}  // namespace vorn

#endif  // VORN_LINUX_SYSTEM_FILE_LOCK_H
