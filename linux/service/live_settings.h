// Settings that apply to the running server without a restart, as far as the kernel allows.
#ifndef VORN_LINUX_SERVICE_LIVE_SETTINGS_H
#define VORN_LINUX_SERVICE_LIVE_SETTINGS_H

#include "box.h"
#include "status.h"

namespace vorn {

// The drop-in that PrepareTransferSizes() installs.
inline constexpr char kDropInFile[] = "/etc/systemd/system/nfs-server.service.d/vorn.conf";

// Installs a drop-in of nfs-server.service, by which each start of the server, whoever asks for it, applies the
// transfer sizes that are configured then (nfsd(7), max_block_size).
Status PrepareTransferSizes(Box& box);

// Applies the transfer sizes, in bytes; 0 is the kernel's choice. The kernel accepts a new size only while its
// server has no threads, so the sizes take effect at the next start, and the log says so. A restart for their
// sake would make every client wait for the grace period, and mounted clients keep their sizes anyway.
Status ApplyTransferSizes(Box& box, int read_size, int write_size);

// Applies the switch for UNIX permissions. rpc.mountd(8) reads it when it starts, and its unit cannot be restarted
// without the kernel's server, so it takes effect at the next start, and the log says so.
Status ApplyUnixPermissions(Box& box, bool managed);

}  // namespace vorn

#endif  // VORN_LINUX_SERVICE_LIVE_SETTINGS_H
