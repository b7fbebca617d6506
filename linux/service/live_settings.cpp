#include "live_settings.h"

#include <syslog.h>  // LOG_NOTICE

#include <algorithm>
#include <cerrno>
#include <string>

#include "call_rights.h"
#include "configuration_lock.h"
#include "notice.h"

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
    LogDone(LOG_NOTICE, "the kernel chooses the size of NFS transfers again when the box has booted");
    return;
  }
  LogDone(LOG_NOTICE, "NFS takes transfers of at most " + std::to_string(size) +
                          " bytes when it starts the next time; clients that are mounted with more must mount again "
                          "then");
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
  box.Rehearse(RehearsedAction::kTransferSizes);
  LogNextStart(std::max(read_size, write_size));
  return {};
}

Status ApplyUnixPermissions(Box& box, bool managed) {
  if (Status status = CheckMayWrite("the UNIX-permission switch"); !status.ok()) return status;
  box.Rehearse(RehearsedAction::kUnixPermissions);
  LogDone(LOG_NOTICE, std::string("UNIX permissions ") + (managed ? "are managed" : "are left alone") +
                          " when NFS starts the next time");
  return {};
}

}  // namespace vorn
