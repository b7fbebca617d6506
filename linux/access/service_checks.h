// Whether the NFS service lets any client in: its state, its versions, its ports.
#ifndef VORN_LINUX_ACCESS_SERVICE_CHECKS_H
#define VORN_LINUX_ACCESS_SERVICE_CHECKS_H

#include <string>

#include "access_checks.h"
#include "box.h"
#include "status.h"

namespace vorn {

// Whether the kernel's server has threads.
bool IsServing(Box& box);

// Checks "service", "version" and "firewall" for a client of this version: "3", "4.0", "4.1" or "4.2".
Status CheckService(Box& box, const std::string& version, AccessChecks* checks);

}  // namespace vorn

#endif  // VORN_LINUX_ACCESS_SERVICE_CHECKS_H
