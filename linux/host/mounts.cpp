#include "mounts.h"

#include <fcntl.h>
#include <libmount/libmount.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstddef>
#include <string>
#include <string_view>

#include "owned.h"

namespace vorn {
namespace {

constexpr const char* kMountInfo = "/proc/self/mountinfo";

using Table = Owned<libmnt_table, mnt_unref_table>;
using Iterator = Owned<libmnt_iter, mnt_free_iter>;

// File systems whose files are not on this box's disks: network file systems, FUSE, the kernel's own. They are
// recognised by name, because asking for a file handle could block on a server or program that is gone.
constexpr std::array<std::string_view, 36> kForeign = {
    "9p",         "afs",        "autofs",    "binfmt_misc", "bpf",      "cgroup", "cgroup2", "cifs",    "coda",
    "configfs",   "debugfs",    "devpts",    "devtmpfs",    "efivarfs", "fuse",   "fuseblk", "fusectl", "gfs2meta",
    "hugetlbfs",  "mqueue",     "ncpfs",     "nfs",         "nfs4",     "nfsd",   "proc",    "pstore",  "ramfs",
    "rpc_pipefs", "securityfs", "selinuxfs", "smb3",        "smbfs",    "sysfs",  "tracefs", "vboxsf",  "virtiofs"};

bool IsForeign(std::string_view type) {
  return type.substr(0, 5) == "fuse." || std::find(kForeign.begin(), kForeign.end(), type) != kForeign.end();
}

bool IsBelow(std::string_view target, std::string_view path) {
  if (path == "/" || target == path) return true;
  return target.size() > path.size() && target.substr(0, path.size()) == path && target[path.size()] == '/';
}

// Whether the file system lacks file handles, by which the server identifies files to its clients. Any other
// error than EOPNOTSUPP says nothing about the file system.
bool LacksHandles(const char* target) {
  file_handle handle{};
  int mount = 0;
  return name_to_handle_at(AT_FDCWD, target, &handle, &mount, 0) != 0 && errno == EOPNOTSUPP;
}

// An overlay has file handles only if it was mounted with nfs_export=on.
bool IsOverlayWithoutHandles(libmnt_fs* entry) {
  return mnt_fs_match_fstype(entry, "overlay") == 1 && mnt_fs_match_options(entry, "nfs_export=on") == 0;
}

bool IsUnexportable(libmnt_fs* entry, bool mounted_here) {
  const char* name = mnt_fs_get_fstype(entry);
  const std::string_view type = name == nullptr ? "" : name;
  if (IsForeign(type) || IsOverlayWithoutHandles(entry)) return true;
  return mounted_here && LacksHandles(mnt_fs_get_target(entry));
}

// The mount that has `path`: the last one of the innermost. nullptr if there is none.
libmnt_fs* FindMountOf(libmnt_table* table, libmnt_iter* iterator, const std::string& path) {
  libmnt_fs* entry = nullptr;
  libmnt_fs* own = nullptr;
  while (mnt_table_next_fs(table, iterator, &entry) == 0) {
    const char* target = mnt_fs_get_target(entry);
    if (target == nullptr || !IsBelow(path, target)) continue;
    if (own == nullptr || IsBelow(target, mnt_fs_get_target(own))) own = entry;
  }
  return own;
}

// Null for a trial root without a mount table.
Result<Table> ReadMounts(const Root& root) {
  const auto file = root.Locate(kMountInfo);
  if (!file.ok()) return file.status();
  Table table(mnt_new_table());
  if (!table) return Status::System(ENOMEM, "mount table");
  errno = 0;
  if (mnt_table_parse_file(table.get(), file->c_str()) == 0) return table;
  if (errno == ENOENT && !root.is_box()) return Table();
  return Status::System(errno == 0 ? EIO : errno, *file);
}

}  // namespace

Result<bool> HasUnexportableMount(Box& box, const std::string& path) {
  const auto table = ReadMounts(box.root());
  if (!table.ok()) return table.status();
  if (!*table) return false;
  const Iterator iterator(mnt_new_iter(MNT_ITER_FORWARD));
  if (!iterator) return Status::System(ENOMEM, "mount table");
  libmnt_fs* entry = nullptr;
  while (mnt_table_next_fs(table->get(), iterator.get(), &entry) == 0) {
    const char* target = mnt_fs_get_target(entry);
    if (target != nullptr && IsBelow(target, path) && IsUnexportable(entry, box.root().is_box())) return true;
  }
  mnt_reset_iter(iterator.get(), MNT_ITER_FORWARD);
  libmnt_fs* own = FindMountOf(table->get(), iterator.get(), path);
  return own != nullptr && IsUnexportable(own, box.root().is_box());
}

Result<bool> IsFileSystemReadOnly(Box& box, const std::string& path) {
  const auto table = ReadMounts(box.root());
  if (!table.ok()) return table.status();
  if (!*table) return false;
  const Iterator iterator(mnt_new_iter(MNT_ITER_FORWARD));
  if (!iterator) return Status::System(ENOMEM, "mount table");
  libmnt_fs* own = FindMountOf(table->get(), iterator.get(), path);
  const char* options = own == nullptr ? nullptr : mnt_fs_get_fs_options(own);
  return options != nullptr && mnt_optstr_get_option(options, "ro", nullptr, nullptr) == 0;
}

Result<std::vector<std::string>> MountsBelow(Box& box, const std::string& path) {
  const auto table = ReadMounts(box.root());
  if (!table.ok()) return table.status();
  std::vector<std::string> mounts;
  if (!*table) return mounts;
  const Iterator iterator(mnt_new_iter(MNT_ITER_FORWARD));
  if (!iterator) return Status::System(ENOMEM, "mount table");
  libmnt_fs* entry = nullptr;
  while (mnt_table_next_fs(table->get(), iterator.get(), &entry) == 0) {
    const char* target = mnt_fs_get_target(entry);
    if (target != nullptr && target != path && IsBelow(target, path)) mounts.emplace_back(target);
  }
  std::sort(mounts.begin(), mounts.end());
  return mounts;
}

}  // namespace vorn
