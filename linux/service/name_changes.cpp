#include "name_changes.h"

#include <netdb.h>
#include <syslog.h>

#include <set>
#include <utility>

#include "export_table.h"
#include "state_file.h"

namespace vorn {
namespace {

// Below /run: after a boot the kernel remembers nothing.
constexpr char kNetgroups[] = "/run/vorn/export-netgroups";

// The netgroups among the clients of the table.
Result<std::set<std::string>> NetgroupsIn(const std::string& table) {
  const Result<std::vector<ExportTableLine>> lines = ReadExportTable(table);
  if (!lines.ok()) return lines.status();
  std::set<std::string> netgroups;
  for (const ExportTableLine& line : *lines) {
    if (line.client.front() == '@') netgroups.emplace(line.client.substr(1));
  }
  return netgroups;
}

Status ApplyNetgroups(Box& box, const ExportsEnvironment& environment, const NetgroupReader& read_netgroup) {
  const Result<StoredFile> table = box.Read(kExportTable);
  if (!table.ok()) return table.status();
  const Result<std::set<std::string>> netgroups = NetgroupsIn(table->text);
  if (!netgroups.ok()) return netgroups.status();
  std::string members;
  for (const std::string& netgroup : *netgroups) members += netgroup + " " + read_netgroup(netgroup) + "\n";
  const Result<StoredFile> before = box.Read(kNetgroups);
  if (!before.ok()) return before.status();
  if (before->text == members) return {};
  syslog(LOG_NOTICE, "the netgroups of the export rules have changed");
  if (Status status = ForgetClients(environment.kernel_caches); !status.ok()) return status;
  return StoreState(box, kNetgroups, members);
}

Status ApplyHosts(Box& box, const ExportsEnvironment& environment) {
  Result<HostAddresses> hosts = ReadExportHosts(box);
  if (!hosts.ok()) return hosts.status();
  const HostAddresses before = *hosts;
  std::set<std::string> names;
  for (const auto& host : before) names.insert(host.first);
  std::set<std::string> moved;
  for (const std::string& name : ResolveExportHosts(names, environment.resolve, &*hosts)) {
    if (before.at(name) != hosts->at(name)) moved.insert(name);
  }
  if (moved.empty()) return {};
  for (const std::string& name : moved) syslog(LOG_NOTICE, "the host %s has another address now", name.c_str());
  if (Status status = StoreExportHosts(box, *hosts); !status.ok()) return status;
  return ApplyExports(box, environment, moved);
}

}  // namespace

std::string ReadNetgroup(const std::string& netgroup) {
  std::set<std::string> members;
  if (setnetgrent(netgroup.c_str()) == 0) return "";
  char* host = nullptr;
  char* user = nullptr;
  char* domain = nullptr;
  while (getnetgrent(&host, &user, &domain) == 1) {
    members.insert(std::string(host == nullptr ? "" : host) + "," + (domain == nullptr ? "" : domain));
  }
  endnetgrent();
  std::string text;
  for (const std::string& member : members) text += "(" + member + ")";
  return text;
}

Status ApplyNameChanges(Box& box, const ExportsEnvironment& environment, const NetgroupReader& read_netgroup) {
  const Status hosts = ApplyHosts(box, environment);
  const Status netgroups = ApplyNetgroups(box, environment, read_netgroup);
  return hosts.ok() ? netgroups : hosts;
}

}  // namespace vorn
