// The table of the NFS settings: each field of the NFS configuration record with its type and its key in nfs.conf(5).
// Reading, comparing and writing a record are loops over this table.
#ifndef VORN_LINUX_SETTINGS_NFS_SETTINGS_H
#define VORN_LINUX_SETTINGS_NFS_SETTINGS_H

#include <cstdint>

#include "nfsconf.h"

namespace vorn {

// The section of the settings for which nfs-utils has no key, and of those that it must not read while they are
// switched off. nfs-utils ignores sections that it does not know.
inline constexpr char kOwnSection[] = "vorn";

struct NFSSetting {
  enum class Type {
    kSize,       // a number from 0
    kPort,       // 0 (any port) to 65535
    kSwitch,     // 0 or 1
    kPrincipal,  // a string
  };

  const char* name;  // of the field, for messages
  Type type;
  std::int32_t NFSConfRecord::*number;  // the field; nullptr for the principal
  const char* section;
  const char* key;
};

// The two ports are stored under these keys whether custom ports are on or not. While they are on, the daemons'
// keys have them, too (kDaemonPorts).
inline constexpr NFSSetting kNFSSettings[] = {
    {"read_size", NFSSetting::Type::kSize, &NFSConfRecord::read_size, kOwnSection, "read-size"},
    {"write_size", NFSSetting::Type::kSize, &NFSConfRecord::write_size, kOwnSection, "write-size"},
    {"enable_nfs_v4", NFSSetting::Type::kSwitch, &NFSConfRecord::enable_nfs_v4, "nfsd", "vers4"},
    {"unix_pri_enable", NFSSetting::Type::kSwitch, &NFSConfRecord::unix_pri_enable, "mountd", "manage-gids"},
    {"custom_port_enable", NFSSetting::Type::kSwitch, &NFSConfRecord::custom_port_enable, kOwnSection, "custom-ports"},
    {"statd_port", NFSSetting::Type::kPort, &NFSConfRecord::statd_port, kOwnSection, "statd-port"},
    {"nlm_port", NFSSetting::Type::kPort, &NFSConfRecord::nlm_port, kOwnSection, "nlm-port"},
    {"kerberos_principal", NFSSetting::Type::kPrincipal, nullptr, kOwnSection, "kerberos-principal"},
};

// The keys from which rpc.statd(8) takes its own port and that of the kernel's lock manager.
struct DaemonPort {
  std::int32_t NFSConfRecord::*port;
  const char* section;
  const char* key;
};
inline constexpr DaemonPort kDaemonPorts[] = {
    {&NFSConfRecord::statd_port, "statd", "port"},
    {&NFSConfRecord::nlm_port, "lockd", "port"},
    {&NFSConfRecord::nlm_port, "lockd", "udp-port"},
};

// rpc.nfsd(8) enables version 4 for a minor version that is enabled by name.
inline constexpr const char* kMinorVersions[] = {"vers4.0", "vers4.1", "vers4.2"};

}  // namespace vorn

#endif  // VORN_LINUX_SETTINGS_NFS_SETTINGS_H
