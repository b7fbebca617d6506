// How the programs of nfs-utils read their files, where their versions differ. The build chooses the source.
#ifndef VORN_LINUX_TEXT_NFS_UTILS_H
#define VORN_LINUX_TEXT_NFS_UTILS_H

namespace vorn {

// nfs.conf(5), idmapd.conf(5): whether a value in [name "argument"] removes an earlier value of the same key in [name].
extern const bool kArgumentsHideValues;

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_NFS_UTILS_H
