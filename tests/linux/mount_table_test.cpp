#include <gtest/gtest.h>
#include <sys/stat.h>

#include <string>

#include "core.h"
#include "filesystem.h"
#include "temporary_root.h"

namespace {

constexpr const char* kMountInfo = "/proc/self/mountinfo";
constexpr int kType = VORNFS_MOUNT_UNEXPORTABLE;

std::string Mount(const std::string& target, const std::string& type, const std::string& options = "rw") {
  return "100 1 0:100 / " + target + " rw,relatime shared:1 - " + type + " source " + options + "\n";
}

const std::string kBox = Mount("/", "ext4") + Mount("/proc", "proc") + Mount("/volume1", "btrfs");

struct MountCase {
  const char* path;  // the share
  std::string mount;
  int found;
};

TEST(VORNFSHasMountPointType, FindsWhatTheKernelServerCannotExport) {
  const MountCase cases[] = {
      {"/volume1/data", "", 0},
      {"/volume1/data", Mount("/volume1/data", "xfs"), 0},
      {"/volume1/data", Mount("/volume1/data/usb", "vfat"), 0},
      {"/volume1/data", Mount("/volume1/data", "fuse"), 1},
      {"/volume1/data", Mount("/volume1/data/ntfs", "fuseblk"), 1},
      {"/volume1/data", Mount("/volume1/data/a/b/c", "fuse.sshfs"), 1},
      {"/volume1/data", Mount("/volume1/data/remote", "cifs"), 1},
      {"/volume1/data", Mount("/volume1/data/remote", "smb3"), 1},
      {"/volume1/data", Mount("/volume1/data/remote", "nfs"), 1},
      {"/volume1/data", Mount("/volume1/data/remote", "nfs4"), 1},
      {"/volume1/data", Mount("/volume1/data/host", "9p"), 1},
      {"/volume1/data", Mount("/volume1/data/run", "proc"), 1},
      {"/volume1/data", Mount("/volume1/data/auto", "autofs"), 1},
      {"/volume1/data", Mount("/volume1/data/merged", "overlay", "rw,lowerdir=/l,upperdir=/u"), 1},
      {"/volume1/data", Mount("/volume1/data/merged", "overlay", "rw,index=on,nfs_export=on"), 0},
      {"/volume1/data", Mount("/volume1/data/merged", "overlay", "rw,nfs_export=off"), 1},
      {"/volume1/data", Mount("/volume1/data2", "fuse.sshfs"), 0},
      {"/volume1/data", Mount("/volume1", "fuse.sshfs"), 1},
      {"/volume1/data/a/b", Mount("/volume1/data", "nfs4"), 1},
      {"/volume1/data", Mount("/volume1", "fuse.sshfs") + Mount("/volume1", "xfs"), 0},
      {"/volume1/data", Mount("/volume1", "fuse.sshfs") + Mount("/volume1/data", "xfs"), 0},
      {"/volume1/data", Mount("/volume1/data", "xfs") + Mount("/volume1/dat", "fuse.sshfs"), 0},
      {"/volume1/data", Mount("/volume2/data/x", "fuse.sshfs"), 0},
      {"/volume1/my data", Mount("/volume1/my\\040data/x", "cifs"), 1},
      {"/", "", 1},
  };
  for (const MountCase& c : cases) {
    const TemporaryRoot root;
    root.Write(kMountInfo, kBox + c.mount);
    EXPECT_EQ(VORNFSHasMountPointType(c.path, kType), c.found) << c.path << " " << c.mount;
  }
}

TEST(VORNFSHasMountPointType, FindsNothingOnARootWithoutMounts) {
  const TemporaryRoot root;
  EXPECT_EQ(VORNFSHasMountPointType("/volume1/data", kType), 0);
}

TEST(VORNFSHasMountPointType, CannotSayFromAFileThatIsNone) {
  const TemporaryRoot root;
  root.Write("/proc/self/mountinfo/file", "");
  EXPECT_LT(VORNFSHasMountPointType("/volume1/data", kType), 0);
  EXPECT_NE(KLIBCErrGet(), 0);
}

TEST(VORNFSHasMountPointType, KnowsNoOtherTypeAndNoRelativePath) {
  const TemporaryRoot root;
  root.Write(kMountInfo, kBox);
  EXPECT_LT(VORNFSHasMountPointType("/volume1/data", 31), 0);
  EXPECT_LT(VORNFSHasMountPointType("volume1", kType), 0);
  EXPECT_LT(VORNFSHasMountPointType(nullptr, kType), 0);
}

}  // namespace
