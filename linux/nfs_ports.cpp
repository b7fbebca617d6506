#include "nfs_ports.h"

#include "core.h"
#include "ini_file.h"
#include "nfsconf.h"

namespace vorn {

Result<std::vector<ConfiguredPort>> ConfiguredPorts() {
  NFSConfRecord record;
  if (VORNNFSConfGet(&record) < 0) return Status::Failure(KLIBCErrGet(), "the configured ports cannot be read");
  const Result<IniFile> system = IniFile::Open("/etc/nfs.conf");
  if (!system.ok()) return system.status();
  const auto nfsd = system->Number("nfsd", "port");
  if (!nfsd.ok()) return nfsd.status();
  const auto mountd = system->Number("mountd", "port");
  if (!mountd.ok()) return mountd.status();
  std::vector<ConfiguredPort> ports{{"rpcbind", 111}, {"nfs", nfsd->value_or(2049)}};
  if (mountd->value_or(0) > 0) ports.push_back({"nfs_mountd", **mountd});
  if (record.custom_port_enable == 0) return ports;
  if (record.statd_port > 0) ports.push_back({"nfs_statd", record.statd_port});
  if (record.nlm_port > 0) ports.push_back({"nfs_nlm", record.nlm_port});
  return ports;
}

}  // namespace vorn
