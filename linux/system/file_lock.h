// A lock that excludes other threads and other processes alike.
#ifndef VORN_LINUX_SYSTEM_FILE_LOCK_H
#define VORN_LINUX_SYSTEM_FILE_LOCK_H

#include <string_view>

#include "file_descriptor.h"
#include "root.h"
#include "status.h"

namespace vorn {

// Waits for the lock on the file at the box's `path`, which is made if it is not there. Whoever has
// the result has the lock; it ends with the open file (flock(2)), so also with its process.
Result<FileDescriptor> TakeFileLock(const Root& root, std::string_view path);

}  // namespace vorn

#endif  // VORN_LINUX_SYSTEM_FILE_LOCK_H
