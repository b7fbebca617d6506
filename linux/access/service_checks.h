// Whether the NFS service lets any client in: its state, its versions, its ports.
#ifndef VORN_LINUX_ACCESS_SERVICE_CHECKS_H
#define VORN_LINUX_ACCESS_SERVICE_CHECKS_H

#include <optional>
#include <string>

#include "access_checks.h"
#include "box.h"
#include "status.h"

namespace vorn {

// Whether the kernel's server has threads.
bool IsServing(Box& box);

// A version of NFS: whether the files switch it on, and whether the kernel's server has it.
struct VersionState {
  bool is_configured = false;
  std::optional<bool> in_force;  // nullopt while the service does not run
};

// `version` is "3", "4.0", "4.1" or "4.2".
Result<VersionState> ReadVersionState(Box& box, const std::string& version);

// Checks "service", "version" and "firewall" for a client of this version: "3", "4.0", "4.1" or "4.2".
Status CheckService(Box& box, const std::string& version, AccessChecks* checks);

}  // namespace vorn

#endif  // VORN_LINUX_ACCESS_SERVICE_CHECKS_H
