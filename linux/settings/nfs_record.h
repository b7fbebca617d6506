// The NFS configuration record (platform/nfsconf.h) in nfs.conf(5).
#ifndef VORN_LINUX_SETTINGS_NFS_RECORD_H
#define VORN_LINUX_SETTINGS_NFS_RECORD_H

#include <string>

#include "box.h"
#include "nfsconf.h"
#include "status.h"

namespace vorn {

// The file that WriteNFSRecord() writes.
inline constexpr char kNFSRecordFile[] = "/etc/nfs.conf.d/vorn.conf";

// The record that is in force, over all files of nfs.conf(5).
Result<NFSConfRecord> ReadNFSRecord(Box& box);

// Makes the fields of the record that differ from what is in force take effect, by keys in
// /etc/nfs.conf.d/vorn.conf, the only file that is written. Before anything is written it fails
// - with EINVAL for a number out of range, for two equal ports while custom ports are on, and if NFS would be left
//   without a version;
// - with kRefusedText for a principal that nfs.conf(5) cannot represent;
// - with kOverridden, naming file and line, if another file decides over a value;
// - with kChangedBehind if one of the files was changed since the configuration context of this thread read it.
// Afterwards what is in force is read back; if it is not the record, the call fails with kChangedBehind.
Status WriteNFSRecord(Box& box, const NFSConfRecord& record);

// Stores the server's own Kerberos principal, and nothing else.
Status StoreKerberosPrincipal(Box& box, const std::string& principal);

}  // namespace vorn

#endif  // VORN_LINUX_SETTINGS_NFS_RECORD_H
