// The actions that a rehearsal records instead of taking them.
#ifndef VORN_LINUX_BOX_REHEARSED_ACTION_H
#define VORN_LINUX_BOX_REHEARSED_ACTION_H

namespace vorn {

enum class RehearsedAction {
  kStart,             // of the service, which also enables it
  kStop,              // which also disables it
  kRestart,           // of the service
  kReload,            // of the export rules
  kRefreshNames,      // of the export rules
  kTransferSizes,     // told to the kernel at the next start
  kUnixPermissions,   // told to the daemons at the next start
  kReloadIdentities,  // S83nfsd.sh reloadidmap
  kFirewall,          // the firewall table is replaced
  kDisconnect,        // the state of a client of NFSv4 ends
};

}  // namespace vorn

#endif  // VORN_LINUX_BOX_REHEARSED_ACTION_H
