// The NFS service as all APIs use it.
#ifndef VORN_SRC_SERVICE_H
#define VORN_SRC_SERVICE_H

#include "core.h"

// The name of the NFS service in the platform's service operations.
inline constexpr char kService[] = "nfsd";

// Returns whether the service is enabled. An unknown state counts as enabled: docs/decisions/0016.
inline bool IsServiceEnabled() { return KLIBServiceIsEnabled(kService) != 0; }

// Makes an enabled service reload its ID map and keytab. Returns false if the service script failed; the
// reason is then in the error facility. Does nothing if the service is disabled.
inline bool ReloadIDMap() {
  if (!IsServiceEnabled()) return true;
  return KLIBCExec("/usr/vorn/etc/rc.sysv/S83nfsd.sh", "reloadidmap", nullptr, nullptr, nullptr) >= 0;
}

#endif  // VORN_SRC_SERVICE_H
