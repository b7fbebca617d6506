// The ports of the NFS service's daemons, as they are configured.
#ifndef VORN_LINUX_NFS_PORTS_H
#define VORN_LINUX_NFS_PORTS_H

#include <string>
#include <vector>

#include "status.h"

namespace vorn {

struct ConfiguredPort {
  std::string service;  // "nfs_statd", "nfs_nlm", "nfs_mountd", "nfs", "rpcbind"
  int port;
};

// Those of the current root: the two that are fixed by the protocols' custom, rpc.mountd(8)'s if nfs.conf(5)
// fixes it, and while custom ports are on those of the status daemon and the lock manager.
Result<std::vector<ConfiguredPort>> ConfiguredPorts();

}  // namespace vorn

#endif  // VORN_LINUX_NFS_PORTS_H
