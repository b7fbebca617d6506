#include "configured_ports.h"

#include "nfs_configuration.h"
#include "nfs_record.h"

namespace vorn {

Result<std::vector<ConfiguredPort>> ReadConfiguredPorts(Box& box) {
  const Result<NFSConfRecord> record = ReadNFSRecord(box);
  if (!record.ok()) return record.status();
  const Result<NFSConfiguration> configuration = NFSConfiguration::Open(box);
  if (!configuration.ok()) return configuration.status();
  int nfsd = 2049;
  int mountd = 0;
  if (Status s = configuration->Read("nfsd", "port", kLargestPort, &nfsd); !s.ok()) return s;
  if (Status s = configuration->Read("mountd", "port", kLargestPort, &mountd); !s.ok()) return s;
  std::vector<ConfiguredPort> ports{{"rpcbind", 111}, {"nfs", nfsd}};
  if (mountd > 0) ports.push_back({"nfs_mountd", mountd});
  if (record->custom_port_enable == 0) return ports;
  if (record->statd_port > 0) ports.push_back({"nfs_statd", record->statd_port});
  if (record->nlm_port > 0) ports.push_back({"nfs_nlm", record->nlm_port});
  return ports;
}

}  // namespace vorn
