#include "mount_table.h"

#include <fcntl.h>
#include <libmount/libmount.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstddef>
#include <string>
#include <string_view>

#include "folder_path.h"
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

// Whether the file system lacks file handles, by which the server identifies files to its clients. Any other
// error than EOPNOTSUPP says nothing about the file system.
bool LacksHandles(const std::string& target) {
  file_handle handle{};
  int mount = 0;
  return name_to_handle_at(AT_FDCWD, target.c_str(), &handle, &mount, 0) != 0 && errno == EOPNOTSUPP;
}

// An overlay has file handles only if it was mounted with nfs_export=on.
bool IsOverlayWithoutHandles(libmnt_fs* entry) {
  return mnt_fs_match_fstype(entry, "overlay") == 1 && mnt_fs_match_options(entry, "nfs_export=on") == 0;
}

bool HasForeignFiles(libmnt_fs* entry) {
  const char* name = mnt_fs_get_fstype(entry);
  return IsForeign(name == nullptr ? "" : name) || IsOverlayWithoutHandles(entry);
}

bool HasReadOnlyOption(libmnt_fs* entry) {
  const char* options = mnt_fs_get_fs_options(entry);
  return options != nullptr && mnt_optstr_get_option(options, "ro", nullptr, nullptr) == 0;
}

// Null for a trial root without a mount table.
Result<Table> ReadMountInfo(const Root& root) {
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

Result<MountTable> MountTable::Read(const Box& box) {
  const auto table = ReadMountInfo(box.root());
  if (!table.ok()) return table.status();
  std::vector<Mount> mounts;
  const Iterator iterator(mnt_new_iter(MNT_ITER_FORWARD));
  if (!iterator) return Status::System(ENOMEM, "mount table");
  libmnt_fs* entry = nullptr;
  while (*table && mnt_table_next_fs(table->get(), iterator.get(), &entry) == 0) {
    const char* folder = mnt_fs_get_target(entry);
    if (folder != nullptr) mounts.push_back({folder, HasForeignFiles(entry), HasReadOnlyOption(entry)});
  }
  return MountTable(std::move(mounts), box.root().is_box());
}

bool MountTable::HasUnexportable(const std::string& path) const {
  const bool found = std::any_of(mounts_.begin(), mounts_.end(), [&](const Mount& mount) {
    return IsAtOrBelow(mount.folder, path) && IsUnexportable(mount);
  });
  const Mount* own = MountOf(path);
  return found || (own != nullptr && IsUnexportable(*own));
}

bool MountTable::IsReadOnly(const std::string& path) const {
  const Mount* own = MountOf(path);
  return own != nullptr && own->is_read_only;
}

std::vector<std::string> MountTable::FoldersBelow(const std::string& path) const {
  std::vector<std::string> folders;
  for (const Mount& mount : mounts_) {
    if (IsBelow(mount.folder, path)) folders.push_back(mount.folder);
  }
  std::sort(folders.begin(), folders.end());
  return folders;
}

bool MountTable::IsUnexportable(const Mount& mount) const {
  return mount.is_foreign || (is_mounted_here_ && LacksHandles(mount.folder));
}

// The mount that has `path`: the last one of the innermost. nullptr if there is none.
const MountTable::Mount* MountTable::MountOf(const std::string& path) const {
  const Mount* own = nullptr;
  for (const Mount& mount : mounts_) {
    if (!IsAtOrBelow(path, mount.folder)) continue;
    if (own == nullptr || IsAtOrBelow(mount.folder, own->folder)) own = &mount;
  }
  return own;
}

}  // namespace vorn
