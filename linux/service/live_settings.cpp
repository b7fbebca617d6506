#include "live_settings.h"

#include <syslog.h>

#include <algorithm>
#include <cerrno>

#include "call_rights.h"
#include "configuration_lock.h"

namespace vorn {
namespace {

// The "-" ignores a failure: a size that the kernel refuses must not keep NFS from starting.
constexpr char kDropInText[] =
    "# Kept by the NFS settings: gives the kernel what nfs.conf says and the daemons of NFS do not tell it.\n"
    "[Service]\n"
    "ExecStartPre=-/usr/vorn/etc/rc.sysv/S83nfsd.sh groups\n"
    "ExecStartPre=-/usr/vorn/etc/rc.sysv/S83nfsd.sh transfersizes\n"
    "ExecStartPre=-/usr/vorn/etc/rc.sysv/S83nfsd.sh lockports\n";

void LogNextStart(int size) {
  if (size == 0) {
    syslog(LOG_NOTICE, "the kernel chooses the size of NFS transfers again when the box has booted");
    return;
  }
  syslog(LOG_NOTICE,
         "NFS takes transfers of at most %d bytes when it starts the next time; clients that are "
         "mounted with more must mount again then",
         size);
}

}  // namespace

Status PrepareTransferSizes(Box& box) {
  const ConfigurationLock lock(box);
  if (!lock.status().ok()) return lock.status();
  const Result<StoredFile> before = box.Read(kDropInFile);
  if (!before.ok()) return before.status();
  return before->text == kDropInText ? box.Confirm(kDropInFile)
                                     : box.Replace(kDropInFile, kDropInText, before->version);
}

Status ApplyTransferSizes(Box& box, int read_size, int write_size) {
  if (std::min(read_size, write_size) < 0) return Status::Failure(EINVAL, "a transfer size is negative");
  if (Status status = PrepareTransferSizes(box); !status.ok()) return status;
  LogNextStart(std::max(read_size, write_size));
  return {};
}

Status ApplyUnixPermissions(bool managed) {
  if (Status status = CheckMayWrite("the UNIX-permission switch"); !status.ok()) return status;
  syslog(LOG_NOTICE, "UNIX permissions %s when NFS starts the next time", managed ? "are managed" : "are left alone");
  return {};
}

}  // namespace vorn
