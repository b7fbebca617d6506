// The operations on the NFS service, by the appliance's name "nfsd".
#ifndef VORN_LINUX_SERVICE_SERVICE_CONTROL_H
#define VORN_LINUX_SERVICE_SERVICE_CONTROL_H

#include <string>

#include "box.h"
#include "status.h"

namespace vorn {

// Each fails with kUnknownService for any other name. One operation runs at a time, over all threads and
// processes, and the configuration locks of the calling thread are released while it waits and runs. Start and
// Restart apply the configured transfer sizes.
Result<bool> IsServiceEnabled(Box& box, const std::string& service);
Status StartService(Box& box, const std::string& service);
Status StopService(Box& box, const std::string& service);
Status RestartService(Box& box, const std::string& service);
Status ReloadService(Box& box, const std::string& service);
Status RefreshServiceNames(Box& box, const std::string& service);

}  // namespace vorn

#endif  // VORN_LINUX_SERVICE_SERVICE_CONTROL_H
