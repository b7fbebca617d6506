#include "filesystem.h"

#include <cerrno>

#include "current_box.h"
#include "error.h"
#include "mount_table.h"

namespace vorn {
namespace {

Result<bool> HasMountPoint(const char* path, int type) {
  if (type != VORNFS_MOUNT_UNEXPORTABLE) return Status::Failure(kUnsupported, "no such type of mount points");
  if (path == nullptr || path[0] != '/') return Status::Failure(EINVAL, "the path of mount points is not absolute");
  const Result<MountTable> mounts = MountTable::Read(CurrentBox());
  if (!mounts.ok()) return mounts.status();
  return mounts->HasUnexportable(path);
}

}  // namespace
}  // namespace vorn

int VORNFSHasMountPointType(const char* path, int type) {
  const vorn::Result<bool> found = vorn::HasMountPoint(path, type);
  if (!found.ok()) return vorn::ToResult(found.status());
  return *found ? 1 : 0;
}
