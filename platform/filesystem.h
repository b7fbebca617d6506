// The platform's file-system library. Thread-safe.
#ifndef VORN_PLATFORM_FILESYSTEM_H
#define VORN_PLATFORM_FILESYSTEM_H

extern "C" {

// The type of mounts whose file system the kernel's NFS server cannot export: FUSE, CIFS, NFS, and overlays without
// file handles (name_to_handle_at(2), exports(5)).
enum { VORNFS_MOUNT_UNEXPORTABLE = 32 };

// Returns 1 if `path` is in a mount of that type, or a folder below it is a mount point of that type, and 0 if not.
// Returns a negative value if the mounts cannot be read; the reason is then in the error facility (core.h).
int VORNFSHasMountPointType(const char* path, int type);

}  // extern "C"

#endif  // VORN_PLATFORM_FILESYSTEM_H
