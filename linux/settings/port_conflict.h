// Whether a port is free for a service of the box.
#ifndef VORN_LINUX_SETTINGS_PORT_CONFLICT_H
#define VORN_LINUX_SETTINGS_PORT_CONFLICT_H

#include <string>

#include "box.h"
#include "status.h"

namespace vorn {

// Returns whether a port from `first` to `last` (both included) is outside of 1 to 65535, is configured for another
// service than `service`, or has a listening socket that rpcbind(8) does not know as the service's own. "nfs_statd" and
// "nfs_nlm" do not exclude each other: one request changes both ports and may exchange them.
Result<bool> IsPortTaken(Box& box, const std::string& service, int first, int last);

}  // namespace vorn

#endif  // VORN_LINUX_SETTINGS_PORT_CONFLICT_H
