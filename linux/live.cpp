#include "live.h"

#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <string>

#include "error.h"
#include "files.h"
#include "nfsconf.h"
#include "root.h"
#include "service.h"

namespace vorn {
namespace {

constexpr char kDropIn[] = "/etc/systemd/system/nfs-server.service.d/vorn.conf";

// nfsd(7): one limit for both directions.
constexpr char kKernelFile[] = "/proc/fs/nfsd/max_block_size";

std::string DropInText(int size) {
  if (size <= 0) return "";
  const std::string number = std::to_string(size);
  return "# Written by the NFS settings: the largest transfer, in bytes.\n[Service]\n"
         "ExecStartPre=/bin/sh -c 'echo " +
         number + " >" + kKernelFile + "'\n";
}

Status RemoveDropIn(const std::string& path) {
  if (unlink(path.c_str()) == 0 || errno == ENOENT) return {};
  return Status::System(errno, path);
}

// 0 leaves the size to the kernel.
Status WriteDropIn(int size) {
  const Result<std::string> path = Root::Current().Locate(kDropIn);
  if (!path.ok()) return path.status();
  const Result<FileText> before = ReadFileOrNothing(*path);
  if (!before.ok()) return before.status();
  const std::string text = DropInText(size);
  if (text == before->text) return {};
  return text.empty() ? RemoveDropIn(*path) : ReplaceFile(*path, text, before->stamp);
}

// The limit in force; 0 while the server has not run yet, or there is none on this system.
int SizeInForce() {
  const Result<FileText> file = ReadFileOrNothing(kKernelFile);
  return file.ok() && Root::Current().is_box() ? std::atoi(file->text.c_str()) : 0;
}

// Raising is worth a restart, over which clients wait and go on. Lowering under mounted clients
// hangs their writes, so it waits for the next start.
Status ApplySizes(int read_size, int write_size) {
  const int size = std::max(read_size, write_size);
  if (Status status = WriteDropIn(size); !status.ok()) return status;
  const int in_force = SizeInForce();
  if (size <= in_force) {
    syslog(LOG_NOTICE, "transfer sizes of at most %d bytes take effect when NFS starts the next time", size);
    return {};
  }
  syslog(LOG_NOTICE, "NFS restarts to raise its transfer sizes from %d to %d bytes", in_force, size);
  return RestartService();
}

}  // namespace

Status PrepareTransferSizes() {
  NFSConfRecord record;
  if (VORNNFSConfGet(&record) < 0) return Status::Failure(KLIBCErrGet(), "the transfer sizes cannot be read");
  return WriteDropIn(std::max(record.read_size, record.write_size));
}

}  // namespace vorn

int VORNNFSUDPPrefSizeSet(int read_size, int write_size) {
  return vorn::ToResult(vorn::ApplySizes(read_size, write_size));
}

// rpc.mountd(8) reads the switch when it starts, and its unit cannot be restarted without the
// kernel's server: clients would be disturbed.
int VORNNFSUNIXPriEnableSet(int enable) {
  syslog(LOG_NOTICE, "UNIX permissions %s when NFS starts the next time",
         enable != 0 ? "are managed" : "are left alone");
  return 0;
}
