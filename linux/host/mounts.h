// The mounts of a box, through libmount on mountinfo (proc(5)).
#ifndef VORN_LINUX_HOST_MOUNTS_H
#define VORN_LINUX_HOST_MOUNTS_H

#include <string>
#include <vector>

#include "box.h"
#include "status.h"

namespace vorn {

// Whether the file system of `path`, or that of a mount below it, is one that the kernel's NFS server cannot export: a
// network file system, FUSE, one of the kernel's own, or one without file handles (exportfs support).
Result<bool> HasUnexportableMount(Box& box, const std::string& path);

// Whether the file system of `path` itself is read-only. The flags of its mount do not count: a service with
// ProtectSystem (systemd.exec(5)) sees read-only mounts where the kernel's server writes. False for a trial root
// without a mount table.
Result<bool> IsFileSystemReadOnly(Box& box, const std::string& path);

// Returns the directories below `path` at which a file system is mounted, sorted. Empty for a trial root without a
// mount table.
Result<std::vector<std::string>> MountsBelow(Box& box, const std::string& path);

}  // namespace vorn

#endif  // VORN_LINUX_HOST_MOUNTS_H
