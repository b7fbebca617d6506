// The NFS configuration record (platform/nfsconf.h) in nfs.conf(5).
#ifndef VORN_LINUX_SETTINGS_NFS_RECORD_H
#define VORN_LINUX_SETTINGS_NFS_RECORD_H

#include <string>

#include "box.h"
#include "nfsconf.h"
#include "status.h"

namespace vorn {

// The record that the files of nfs.conf(5) together configure.
Result<NFSConfRecord> ReadNFSRecord(Box& box);

// Stores the record in /etc/nfs.conf.d/vorn.conf, the only file that is written. Fails with kChangedBehind
// if that file was changed since the configuration context of this thread read it.
Status WriteNFSRecord(Box& box, const NFSConfRecord& record);

// Stores the server's own Kerberos principal, and nothing else.
Status StoreKerberosPrincipal(Box& box, const std::string& principal);

}  // namespace vorn

#endif  // VORN_LINUX_SETTINGS_NFS_RECORD_H
