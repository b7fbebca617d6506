// The parts of the export table that the kernel's server remembers in its caches.
#ifndef VORN_LINUX_SERVICE_KERNEL_EXPORTS_H
#define VORN_LINUX_SERVICE_KERNEL_EXPORTS_H

#include <functional>
#include <string>

#include "export_table_update.h"
#include "kernel_cache.h"
#include "status.h"

namespace vorn {

// Writes lines to the channel of the rights (nfsd.export), one at a time.
using RightsWriter = std::function<Status(const std::string& lines)>;

// Makes the kernel's server forget the entries that the update concerns, so that it asks rpc.mountd(8) at the next
// request: rights in the changed directories, in those below and above them, and in directories that were moved since
// they were exported, and, if a client is new in the table or has left it, to which clients an address belongs. All
// other entries stay, so other requests are served without rpc.mountd, which reads the whole table again first.
//
// All of a cache is flushed if its entries cannot be expired one by one. The cache of rights is also flushed if a file
// system has lost its last export: an expired entry keeps a reference to its directory, and the file system could not
// be unmounted.
//
// `folder` is that of the caches (kKernelCaches). An entry of the rights refers to a directory in the mount namespace
// of rpc.mountd, and only a process in that namespace can expire it: `write_rights` must write from there.
Status ForgetExports(const std::string& folder, const ExportTableUpdate& update, const RightsWriter& write_rights);

// Makes the kernel's server ask rpc.mountd again to which clients an address belongs.
Status ForgetClients(const std::string& folder);

}  // namespace vorn

#endif  // VORN_LINUX_SERVICE_KERNEL_EXPORTS_H
