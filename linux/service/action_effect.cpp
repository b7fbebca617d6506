#include "action_effect.h"

#include <charconv>

#include "nfs_configuration.h"

namespace vorn {
namespace {

constexpr char kKernelGrace[] = "/proc/fs/nfsd/nfsv4gracetime";
constexpr int kDefaultGrace = 90;  // of the kernel: NFSD_DEFAULT_GRACE

int GraceOfKernel(Box& box) {
  const Result<StoredFile> file = box.Read(kKernelGrace);
  int seconds = 0;
  if (file.ok()) std::from_chars(file->text.data(), file->text.data() + file->text.size(), seconds);
  return seconds > 0 ? seconds : kDefaultGrace;
}

// rpc.nfsd(8) gives the kernel the grace period of NFSv4 and of the lock manager; 0 or nothing leaves it as it is.
int GraceSeconds(Box& box) {
  const Result<NFSConfiguration> configuration = NFSConfiguration::Open(box);
  const int configured = configuration.ok() ? configuration->Number("nfsd", "grace-time", 0) : 0;
  return configured > 0 ? configured : GraceOfKernel(box);
}

ActionEffect Restart(Box& box) {
  const int grace = GraceSeconds(box);
  return {"restart", "restart", grace,
          "The NFS service restarts. Mounted clients wait meanwhile and continue; for " + std::to_string(grace) +
              " seconds after it, no client can open further files over NFSv4 or get new locks."};
}

}  // namespace

ActionEffect EffectOf(RehearsedAction action, Box& draft) {
  switch (action) {
    case RehearsedAction::kStart:
      return {"start", "start", {}, "The NFS service starts, now and at each boot. Clients can mount."};
    case RehearsedAction::kStop:
      return {"stop", "stop", {}, "The NFS service stops, also for later boots. Programs on mounted clients wait."};
    case RehearsedAction::kRestart:
      return Restart(draft);
    case RehearsedAction::kReload:
      return {"reload", "reload", {}, "The changed export rules apply at once, without an interruption."};
    case RehearsedAction::kRefreshNames:
      return {"refresh_names", "reload", {}, "Changed addresses of hosts apply at once, without an interruption."};
    case RehearsedAction::kTransferSizes:
      return {"transfer_sizes", "nothing", {}, "The transfer sizes apply when the NFS service starts the next time."};
    case RehearsedAction::kUnixPermissions:
      return {"unix_permissions",
              "nothing",
              {},
              "The switch for UNIX permissions applies when the NFS service starts the next time."};
    case RehearsedAction::kReloadIdentities:
      return {"reload_identities",
              "reload",
              {},
              "The ID mappings and the keytab apply at once; daemons whose settings changed restart, without an "
              "interruption for clients."};
    case RehearsedAction::kFirewall:
      return {"firewall", "nothing", {}, "The firewall opens the ports that are configured then, and no others."};
    case RehearsedAction::kDisconnect:
      return {"disconnect",
              "disconnect",
              {},
              "The client loses its open files and locks over NFSv4. It gets them again if nobody else has them "
              "meanwhile."};
  }
  return {"", "nothing", {}, ""};
}

}  // namespace vorn
