// Settings of the running server that nfs.conf(5) has no key for.
#ifndef VORN_LINUX_LIVE_H
#define VORN_LINUX_LIVE_H

#include "status.h"

namespace vorn {

// Makes sure that each start of the server, whoever asks for it, takes the transfer sizes that are configured
// then: a drop-in of its unit has them handed to the kernel.
Status PrepareTransferSizes();

}  // namespace vorn

#endif  // VORN_LINUX_LIVE_H
