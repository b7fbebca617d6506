// The NFS service, as every API addresses it.
#ifndef VORN_SRC_SERVICE_H
#define VORN_SRC_SERVICE_H

#include "core.h"

// By the platform's name.
inline constexpr char kService[] = "nfsd";

// Whether the platform counts the service as enabled; when it cannot tell, it does.
inline bool IsServiceEnabled() { return KLIBServiceIsEnabled(kService) != 0; }

// Has a service that is enabled take up a changed ID map or keytab. False when its script failed;
// the reason is then in the error facility.
inline bool ReloadIDMap() {
  if (!IsServiceEnabled()) return true;
  return KLIBCExec("/usr/vorn/etc/rc.sysv/S83nfsd.sh", "reloadidmap", nullptr, nullptr, nullptr) >= 0;
}

#endif  // VORN_SRC_SERVICE_H
