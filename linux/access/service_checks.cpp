#include "service_checks.h"

#include <vector>

#include "configured_ports.h"
#include "firewall_table.h"
#include "kernel_statistics.h"
#include "lines.h"
#include "nfs_configuration.h"

namespace vorn {
namespace {

constexpr char kVersionsInForce[] = "/proc/fs/nfsd/versions";

Status CheckState(Box& box, AccessChecks* checks) {
  const Result<Engine*> engine = box.engine();
  if (!engine.ok()) return engine.status();
  const Result<bool> is_enabled = (*engine)->IsEnabled();
  if (!is_enabled.ok()) return is_enabled.status();
  const bool has_kernel = box.Exists(kKernelStatistics);
  if (IsServing(box)) {
    checks->Pass("service", "The NFS service is running.");
  } else if (!*is_enabled) {
    checks->Fail("service", "The NFS service is switched off.", "Switch NFS on.");
  } else if (has_kernel) {
    checks->Fail("service", "The NFS service is switched on and does not serve.",
                 "Restart NFS, and read the log of the box.");
  } else {
    checks->Pass("service", "The NFS service is switched on.");
  }
  return {};
}

// Returns whether the kernel's server has this version; nullopt if it does not serve.
std::optional<bool> HasVersion(Box& box, const std::string& version) {
  const Result<StoredFile> file = box.Read(kVersionsInForce);
  if (!file.ok() || !file->version.exists || !IsServing(box)) return std::nullopt;
  bool is_implied = false;                                   // "+4" stands for 4.0, too, unless there is "-4.0"
  for (const std::string_view word : WordsOf(file->text)) {  // "-2 +3 +4 +4.1 +4.2"
    if (word.substr(1) == version) return word[0] == '+';
    is_implied = is_implied || (word == "+4" && version == "4.0");
  }
  return is_implied;
}

bool IsConfigured(const NFSConfiguration& configuration, const std::string& version) {
  if (version == "3") return configuration.Switch("nfsd", "vers3", true);
  const std::string minor = "vers" + version;
  const bool is_on = configuration.Switch("nfsd", "vers4", true);
  return configuration.Switch("nfsd", minor.c_str(), is_on);
}

Status CheckVersion(Box& box, const std::string& version, AccessChecks* checks) {
  const Result<VersionState> state = ReadVersionState(box, version);
  if (!state.ok()) return state.status();
  if (state->in_force.value_or(state->is_configured)) {
    checks->Pass("version", "The service accepts version " + version + " of NFS.");
  } else {
    checks->Fail("version", "The service does not accept version " + version + " of NFS.",
                 state->is_configured ? "Restart NFS: the version is switched on since its start."
                                      : "Switch the version on (nfs.conf, section nfsd), or mount with another one.");
  }
  return {};
}

bool IsNeeded(const ConfiguredPort& port, bool is_version_3) {
  return port.service == "nfs" || (is_version_3 && (port.service == "rpcbind" || port.service == "nfs_mountd"));
}

Status CheckFirewall(Box& box, bool is_version_3, AccessChecks* checks) {
  const Result<std::vector<ConfiguredPort>> ports = ReadConfiguredPorts(box);
  if (!ports.ok()) return ports.status();
  std::vector<ConfiguredPort> needed;
  bool has_mountd = false;
  for (const ConfiguredPort& port : *ports) {
    has_mountd = has_mountd || port.service == "nfs_mountd";
    if (IsNeeded(port, is_version_3)) needed.push_back(port);
  }
  const std::optional<std::vector<std::string>> closed = DescribeClosedPorts(box, needed);
  if (!closed) {
    checks->Doubt("firewall", "The packet filters of the box cannot be seen here.");
  } else if (!closed->empty()) {
    checks->Doubt("firewall", closed->front());
  } else if (is_version_3 && !has_mountd) {
    checks->Doubt("firewall",
                  "rpc.mountd has no fixed port, so a firewall between the box and the client may close it.");
  } else {
    checks->Pass("firewall", "No packet filter of the box closes the ports of NFS.");
  }
  return {};
}

}  // namespace

bool IsServing(Box& box) {
  const Result<StoredFile> file = box.Read(kKernelStatistics);
  return file.ok() && file->version.exists && ParseKernelStatistics(file->text).threads > 0;
}

Result<VersionState> ReadVersionState(Box& box, const std::string& version) {
  const Result<NFSConfiguration> configuration = NFSConfiguration::Open(box);
  if (!configuration.ok()) return configuration.status();
  return VersionState{IsConfigured(*configuration, version), HasVersion(box, version)};
}

Status CheckService(Box& box, const std::string& version, AccessChecks* checks) {
  Status status = CheckState(box, checks);
  if (status.ok()) status = CheckVersion(box, version, checks);
  return status.ok() ? CheckFirewall(box, version == "3", checks) : status;
}

}  // namespace vorn
