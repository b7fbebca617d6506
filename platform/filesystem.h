// The platform's file-system library.
#ifndef VORN_PLATFORM_FILESYSTEM_H
#define VORN_PLATFORM_FILESYSTEM_H

extern "C" {

// A mount whose file system the kernel's NFS server cannot export: FUSE, CIFS, NFS, an overlay
// without file handles.
enum { VORNFS_MOUNT_UNEXPORTABLE = 32 };

// 1 when `path`, or a folder below it, is a mount point of that type; 0 when none is. Negative when
// that cannot be found out.
int VORNFSHasMountPointType(const char* path, int type);

}  // extern "C"

#endif  // VORN_PLATFORM_FILESYSTEM_H
