// Service control: what an engine does for the NFS service, and the two engines.
#ifndef VORN_LINUX_SERVICE_H
#define VORN_LINUX_SERVICE_H

#include <chrono>
#include <memory>
#include <string>

#include "status.h"

namespace vorn {

// Each operation returns once the service is in its new state, or has failed to get there.
class ServiceEngine {
 public:
  virtual ~ServiceEngine() = default;
  virtual Result<bool> IsEnabled() = 0;
  virtual Status Start() = 0;  // and enable
  virtual Status Stop() = 0;   // and disable
  virtual Status Restart() = 0;
  // A service that does not run has nothing to reload, successfully.
  virtual Status Reload() = 0;
};

// Where the systemd engine finds the system; the defaults are a box.
struct SystemdOptions {
  std::string bus_address;  // empty: the system bus
  std::string threads_file = "/proc/fs/nfsd/threads";
  std::chrono::seconds job_limit{120};
};

// nfs-server.service over org.freedesktop.systemd1(5).
std::unique_ptr<ServiceEngine> MakeSystemdEngine(SystemdOptions options = {});

// For a root that is no booted system: the enabled state is kept in the root, and the log says what
// would have been done.
std::unique_ptr<ServiceEngine> MakeLocalEngine();

}  // namespace vorn

#endif  // VORN_LINUX_SERVICE_H
