// Settings of the running server that nfs.conf(5) has no key for.
#ifndef VORN_LINUX_LIVE_H
#define VORN_LINUX_LIVE_H

#include "status.h"

namespace vorn {

// Has the server's next start take the configured transfer sizes: a drop-in of its unit writes
// them to the kernel, which takes them only while it has no server threads.
Status PrepareTransferSizes();

}  // namespace vorn

#endif  // VORN_LINUX_LIVE_H
