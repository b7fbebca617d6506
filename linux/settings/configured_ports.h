// The ports that the daemons of the NFS service are configured to use.
#ifndef VORN_LINUX_SETTINGS_CONFIGURED_PORTS_H
#define VORN_LINUX_SETTINGS_CONFIGURED_PORTS_H

#include <string>
#include <vector>

#include "box.h"
#include "status.h"

namespace vorn {

struct ConfiguredPort {
  std::string service;  // "nfs_statd", "nfs_nlm", "nfs_mountd", "nfs", "rpcbind"
  int port;
};

// The well-known ports 111 (rpcbind) and 2049 (nfs, unless nfs.conf(5) has another), the port of rpc.mountd(8)
// if nfs.conf fixes it, and, while custom ports are on, those of rpc.statd(8) and the lock manager.
Result<std::vector<ConfiguredPort>> ReadConfiguredPorts(Box& box);

}  // namespace vorn

#endif  // VORN_LINUX_SETTINGS_CONFIGURED_PORTS_H
