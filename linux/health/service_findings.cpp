#include "service_findings.h"

#include <sys/statvfs.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <iterator>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "configured_ports.h"
#include "firewall_table.h"
#include "nfs_configuration.h"
#include "nfs_settings.h"
#include "service_checks.h"

namespace vorn {
namespace {

constexpr char kShortOfSpace[] = "Remove files, or enlarge the file system.";
constexpr const char* kOwnFolders[] = {"/etc", "/var/lib/vorn", "/var/lib/nfs"};
constexpr std::uint64_t kEnough = std::uint64_t{16} << 20;  // bytes for a change of the configuration and its history

VORN::HealthSubject OfSetting(const char* setting) {
  VORN::HealthSubject subject;
  subject.setting = setting;
  return subject;
}

bool HasAnyVersion(const NFSConfiguration& configuration) {
  if (configuration.Switch("nfsd", "vers3", true) || configuration.Switch("nfsd", "vers4", true)) return true;
  return std::any_of(std::begin(kMinorVersions), std::end(kMinorVersions),
                     [&](const char* minor) { return configuration.Switch("nfsd", minor, false); });
}

// The reason that the files show; a sentence with a blank before it.
std::string WhyItDoesNotStart(Box& box) {
  const Result<NFSConfiguration> configuration = NFSConfiguration::Open(box);
  if (!configuration.ok()) return " nfs.conf(5) cannot be read: " + configuration.status().reason() + ".";
  const Status& readable = configuration->files().CheckReadable();
  if (!readable.ok()) return " rpc.nfsd(8) cannot read its configuration: " + readable.reason() + ".";
  if (!HasAnyVersion(*configuration)) return " All versions of NFS are switched off in nfs.conf(5).";
  const int statd = configuration->Port("statd", "port", 0);
  if (statd != 0 && statd == configuration->Port("lockd", "port", 0)) {
    return " rpc.statd(8) and the lock manager have the same port, " + std::to_string(statd) + ".";
  }
  return " The configuration files do not show why.";
}

// The free room of a file system, as root finds it.
struct Space {
  std::uint64_t bytes = 0;
  bool has_files = true;  // whether a new file can be made
};

Result<Space> SpaceOf(const Box& box, const std::string& folder) {
  const Result<std::string> location = box.root().Locate(folder);
  if (!location.ok()) return location.status();
  struct statvfs system {};
  if (statvfs(location->c_str(), &system) != 0) return Status::System(errno, folder);
  return Space{std::uint64_t{system.f_bfree} * system.f_frsize, system.f_files == 0 || system.f_ffree > 0};
}

void CheckOwnFolder(const std::string& folder, const Space& space, Findings* findings) {
  if (space.bytes >= kEnough && space.has_files) return;
  VORN::HealthSubject subject;
  subject.file = folder;
  findings->Error(std::move(subject),
                  "The file system of " + folder + " has " + std::to_string(space.bytes >> 20) + " MiB of free space" +
                      (space.has_files ? "" : " and no room for another file") +
                      ": changes of the configuration fail, and so may the next start of NFS.",
                  kShortOfSpace);
}

void CheckShare(const SharedFolder& share, const Space& space, Findings* findings) {
  if (space.bytes > 0 && space.has_files) return;
  VORN::HealthSubject subject;
  subject.share = share.name;
  findings->Error(std::move(subject),
                  "The file system of the share \"" + share.name +
                      "\" has no free space: clients cannot write to it, nor "
                      "to the other shares there.",
                  kShortOfSpace);
}

}  // namespace

Status FindStoppedService(const HealthInput& input, Findings* findings) {
  const Result<Engine*> engine = input.box.engine();
  if (!engine.ok()) return engine.status();
  const Result<bool> is_enabled = (*engine)->IsEnabled();
  if (!is_enabled.ok()) return is_enabled.status();
  if (!*is_enabled || IsServing(input.box)) return {};
  if (Status status = CheckKernelIsSeen(input.box); !status.ok()) return status;
  findings->Error(
      {}, "NFS is switched on and does not serve: clients wait." + WhyItDoesNotStart(input.box),
      "Correct the cause and restart NFS; \"systemctl status nfs-server\" shows the log of the last start.");
  return {};
}

Status FindVersionsNotInForce(const HealthInput& input, Findings* findings) {
  if (!IsServing(input.box)) return {};  // a start reads the files
  for (const char* version : {"3", "4.0", "4.1", "4.2"}) {
    const Result<VersionState> state = ReadVersionState(input.box, version);
    if (!state.ok()) return state.status();
    if (!state->in_force || *state->in_force == state->is_configured) continue;
    const std::string name = std::string("NFS version ") + version;
    findings->Warning(OfSetting((std::string("nfsd vers") + version).c_str()),
                      *state->in_force ? "Clients can still use " + name + ", which nfs.conf(5) switches off."
                                       : "Clients cannot use " + name + " yet, which nfs.conf(5) switches on.",
                      "Restart NFS; clients wait until its grace period is over.");
  }
  return {};
}

Status FindClosedPorts(const HealthInput& input, Findings* findings) {
  const Result<std::vector<ConfiguredPort>> ports = ReadConfiguredPorts(input.box);
  if (!ports.ok()) return ports.status();
  return JudgePorts(DescribeClosedPorts(input.box, *ports), findings);
}

Status JudgePorts(const std::optional<std::vector<std::string>>& closed, Findings* findings) {
  if (!closed) return Status::Failure(kUnsupported, "The packet filters of the box cannot be seen from here.");
  for (const std::string& sentence : *closed) {
    findings->Error({}, "Clients may not reach the service: " + sentence + ".",
                    "Open the ports in that firewall as the text says.");
  }
  return {};
}

Status FindFullFileSystems(const HealthInput& input, Findings* findings) {
  std::set<dev_t> seen;
  for (const char* folder : kOwnFolders) {
    const std::optional<dev_t> device = DeviceOfFolder(input.box, folder);
    if (!device || !seen.insert(*device).second) continue;
    const Result<Space> space = SpaceOf(input.box, folder);
    if (!space.ok()) return space.status();
    CheckOwnFolder(folder, *space, findings);
  }
  for (std::size_t at = 0; at < input.shares.size(); ++at) {
    if (!input.devices[at] || !seen.insert(*input.devices[at]).second) continue;
    const Result<Space> space = SpaceOf(input.box, input.shares[at].path);
    if (!space.ok()) return space.status();
    CheckShare(input.shares[at], *space, findings);
  }
  return {};
}

}  // namespace vorn
