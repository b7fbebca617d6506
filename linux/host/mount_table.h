// The mounts of a box, through libmount on mountinfo (proc(5)).
#ifndef VORN_LINUX_HOST_MOUNT_TABLE_H
#define VORN_LINUX_HOST_MOUNT_TABLE_H

#include <string>
#include <utility>
#include <vector>

#include "box.h"
#include "status.h"

namespace vorn {

// The mounts at one moment. Paths are those of the box. Reading operations are thread-safe.
class MountTable {
 public:
  // Returns an empty table for a trial root without a mount table.
  static Result<MountTable> Read(const Box& box);

  // Whether the file system of `path`, or that of a mount below it, is one that the kernel's NFS server cannot export:
  // a network file system, FUSE, one of the kernel's own, or one without file handles (exportfs support).
  bool HasUnexportable(const std::string& path) const;

  // Whether the file system of `path` itself is read-only. The flags of its mount do not count: a service with
  // ProtectSystem (systemd.exec(5)) sees read-only mounts where the kernel's server writes.
  bool IsReadOnly(const std::string& path) const;

  // Returns the folders below `path` at which a file system is mounted, sorted.
  std::vector<std::string> FoldersBelow(const std::string& path) const;

 private:
  struct Mount {
    std::string folder;
    bool is_foreign;    // its files are not on this box's disks, or it is an overlay without file handles
    bool is_read_only;  // the file system
  };

  MountTable(std::vector<Mount> mounts, bool is_mounted_here)
      : mounts_(std::move(mounts)), is_mounted_here_(is_mounted_here) {}

  bool IsUnexportable(const Mount& mount) const;
  const Mount* MountOf(const std::string& path) const;

  std::vector<Mount> mounts_;  // in the order in which they were mounted
  bool is_mounted_here_;       // whether the mounts are those of this system: a trial root only tells of them
};

}  // namespace vorn

#endif  // VORN_LINUX_HOST_MOUNT_TABLE_H
