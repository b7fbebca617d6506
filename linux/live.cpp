// What a running server does not take leaves its clients alone and waits for the next start, and the log says so.
#include "live.h"

#include <syslog.h>

#include <algorithm>
#include <cerrno>
#include <string>

#include "error.h"
#include "files.h"
#include "lock.h"
#include "nfsconf.h"
#include "root.h"

namespace vorn {
namespace {

constexpr char kDropIn[] = "/etc/systemd/system/nfs-server.service.d/vorn.conf";

// A size that the kernel refuses must not keep NFS from starting, hence "-".
constexpr char kDropInText[] =
    "# Kept by the NFS settings: gives the kernel what nfs.conf.d/vorn.conf says and rpc.nfsd(8) does not read.\n"
    "[Service]\n"
    "ExecStartPre=-/usr/vorn/etc/rc.sysv/S83nfsd.sh groups\n"
    "ExecStartPre=-/usr/vorn/etc/rc.sysv/S83nfsd.sh transfersizes\n";

// The kernel takes a new size only while its server has no threads. A restart for its sake would have every
// client wait for the grace period, those that are mounted would go on with the sizes that they have, and
// a caller who stores the record only afterwards would have to let go of the configuration half-way.
Status AnnounceSizes(int read_size, int write_size) {
  if (std::min(read_size, write_size) < 0) return Status::Failure(EINVAL, "a transfer size is negative");
  if (Status status = PrepareTransferSizes(); !status.ok()) return status;
  const int size = std::max(read_size, write_size);
  if (size == 0) {
    syslog(LOG_NOTICE, "the kernel chooses the size of NFS transfers again when the box has booted");
  } else {
    syslog(LOG_NOTICE,
           "NFS takes transfers of at most %d bytes when it starts the next time; clients that are "
           "mounted with more must mount again then",
           size);
  }
  return {};
}

}  // namespace

Status PrepareTransferSizes() {
  const ConfigurationLock lock;
  if (!lock.status().ok()) return lock.status();
  const Result<std::string> path = Root::Current().Locate(kDropIn);
  if (!path.ok()) return path.status();
  const Result<FileText> before = ReadFileOrNothing(*path);
  if (!before.ok()) return before.status();
  return before->text == kDropInText ? ConfirmFile(*path) : ReplaceFile(*path, kDropInText, before->stamp);
}

}  // namespace vorn

int VORNNFSUDPPrefSizeSet(int read_size, int write_size) {
  return vorn::ToResult(vorn::AnnounceSizes(read_size, write_size));
}

// rpc.mountd(8) reads the switch when it starts, and its unit cannot be restarted without the
// kernel's server: clients would be disturbed.
int VORNNFSUNIXPriEnableSet(int enable) {
  syslog(LOG_NOTICE, "UNIX permissions %s when NFS starts the next time",
         enable != 0 ? "are managed" : "are left alone");
  return 0;
}
