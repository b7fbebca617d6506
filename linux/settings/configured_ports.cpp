#include "configured_ports.h"

#include "nfs_configuration.h"
#include "nfs_record.h"

namespace vorn {

Result<std::vector<ConfiguredPort>> ReadConfiguredPorts(Box& box) {
  const Result<NFSConfRecord> record = ReadNFSRecord(box);
  if (!record.ok()) return record.status();
  const Result<NFSConfiguration> configuration = NFSConfiguration::Open(box);
  if (!configuration.ok()) return configuration.status();
  std::vector<ConfiguredPort> ports{{"rpcbind", 111}, {"nfs", configuration->Port("nfsd", "port", 2049)}};
  const int mountd = configuration->Port("mountd", "port", 0);
  if (mountd > 0) ports.push_back({"nfs_mountd", mountd});
  if (record->custom_port_enable == 0) return ports;
  if (record->statd_port > 0) ports.push_back({"nfs_statd", record->statd_port});
  if (record->nlm_port > 0) ports.push_back({"nfs_nlm", record->nlm_port});
  return ports;
}

}  // namespace vorn
