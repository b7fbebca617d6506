#include "export_findings.h"

#include <cstddef>
#include <map>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "box_paths.h"
#include "export_hosts.h"
#include "export_table.h"
#include "exports_in_force.h"
#include "left_shares.h"
#include "service_checks.h"

namespace vorn {
namespace {

// Says which lines of its file exportfs(8) does not reach because of a fault. `faulty` is the index of the line, and
// `end` of the first line of another file.
std::string DescribeHidden(const HealthInput& input, std::size_t faulty, std::size_t end) {
  const std::size_t count = end - faulty - 1;
  if (count == 0) return "";
  const std::string others = count == 1 ? "." : " and " + std::to_string(count - 1) + " more from the lines after it.";
  return " exportfs(8) stops there: a start of NFS without vornd does not export " +
         input.exported[faulty + 1].directory + others;
}

// The index after the last line of each file.
std::map<const ExportsFile*, std::size_t> EndsOfFiles(const HealthInput& input) {
  std::map<const ExportsFile*, std::size_t> ends;
  for (std::size_t at = 0; at < input.exported.size(); ++at) ends[input.exported[at].file] = at + 1;
  return ends;
}

}  // namespace

Status FindExportsNotInForce(const HealthInput& input, Findings* findings) {
  if (Status status = CheckKernelIsSeen(input.box); !status.ok()) return status;
  if (!IsServing(input.box)) return {};  // a start reads the files
  const Result<StoredFile> table = input.box.Read(kExportTable);
  if (!table.ok()) return table.status();
  const Result<HostAddresses> hosts = ReadExportHosts(input.box);
  if (!hosts.ok()) return hosts.status();
  const auto pending = FindPendingExports(input.files, table->text, BoxPaths(input.box.root()), *hosts);
  if (!pending.ok()) return pending.status();
  std::set<std::string> left = *pending;
  const auto add = [&](const std::string& directory, VORN::HealthSubject subject, const std::string& what) {
    findings->Error(std::move(subject),
                    "The running service has other rules for " + what + " than the files: clients get what the files " +
                        "said before.",
                    "Save the rules of a share, which makes the service read all files, or run "
                    "\"systemctl restart nfs-server\".");
    left.erase(directory);
  };
  for (const ExportedLine& exported : input.exported) {
    if (left.count(exported.directory) != 0) add(exported.directory, exported.Subject(), exported.Exported());
  }
  for (const std::string& directory : std::set<std::string>(left)) add(directory, {}, directory);
  return {};
}

Status FindExportFaults(const HealthInput& input, Findings* findings) {
  const auto ends = EndsOfFiles(input);
  for (std::size_t at = 0; at < input.exported.size(); ++at) {
    const ExportedLine& exported = input.exported[at];
    if (!exported.line->fault) continue;
    const ExportFault& fault = *exported.line->fault;
    const std::string text = exported.Name() + " is faulty: " + fault.reason +
                             ". The rules of this line are not applied; clients keep what they had.";
    const std::string remedy = "Mend the line, and save the rules of the share.";
    if (fault.ends_file) {
      findings->Error(exported.Subject(), text + DescribeHidden(input, at, ends.at(exported.file)), remedy);
    } else {
      findings->Warning(exported.Subject(), text, remedy);
    }
  }
  return {};
}

Status FindExportsOfLeftShares(const HealthInput& input, Findings* findings) {
  const Result<std::vector<std::string>> left = FindLeftShares(input.box, input.files.front()->document);
  if (!left.ok()) return left.status();
  for (const std::string& directory : *left) {
    const ExportedLine& exported = input.exported[input.lines_of.at(directory).front()];
    findings->Warning(exported.Subject(), "Clients still reach " + directory + ", which is no shared folder any more.",
                      "Remove its line from /etc/exports, or make it a shared folder again. With "
                      "\"withdraw_left_shares = yes\" in /etc/vorn/platform.conf the next save removes such lines.");
  }
  return {};
}

Status FindForeignExports(const HealthInput& input, Findings* findings) {
  for (const ExportedLine& exported : input.exported) {
    if (exported.share == nullptr || exported.file->path == kExportsFile) continue;
    findings->Notice(exported.Subject(),
                     exported.Name() + " has rules for " + exported.Exported() +
                         ": clients get them, and they cannot be changed by a call.",
                     "Move the rules to /etc/exports if they shall be changed here.");
  }
  return {};
}

Status FindLinkedExports(const HealthInput& input, Findings* findings) {
  for (const ExportedLine& exported : input.exported) {
    if (exported.share == nullptr || exported.line->path == exported.directory) continue;
    findings->Notice(exported.Subject(),
                     exported.Name() + " exports " + exported.Exported() + " as " + exported.line->path +
                         ", where a symbolic link leads to it. Whoever changes the link changes what clients reach.",
                     "Write " + exported.directory + " in this line.");
  }
  return {};
}

Status FindMissingFolders(const HealthInput& input, Findings* findings) {
  for (std::size_t at = 0; at < input.shares.size(); ++at) {
    if (input.devices[at]) continue;
    const SharedFolder& share = input.shares[at];
    VORN::HealthSubject subject;
    subject.share = share.name;
    VORN::HealthFinding& finding = findings->Warning(
        std::move(subject), "The folder " + share.path + " of the share \"" + share.name + "\" does not exist.",
        "Mount or create the folder, or remove its rules and stop sharing it.");
    finding.call = {"VORN.Core.Share", 1, "delete", {{"name", share.name}}};
  }
  return {};
}

}  // namespace vorn
