#include "name_findings.h"

#include <algorithm>
#include <map>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "box_paths.h"
#include "export_hosts.h"
#include "export_table.h"
#include "export_table_update.h"
#include "exports_client.h"
#include "hosts_text.h"
#include "kernel_cache.h"
#include "service_checks.h"

namespace vorn {
namespace {

constexpr char kHosts[] = "/etc/hosts";

// The first rule of each host name, by the key of the name.
struct NamedRule {
  const ExportedLine* line = nullptr;
  std::string client;
};

std::map<std::string, NamedRule> RulesOfHosts(const HealthInput& input) {
  std::map<std::string, NamedRule> rules;
  for (const ExportedLine& line : input.exported) {
    for (const ExportEntry& entry : line.line->entries) {
      if (IsExportHostName(entry.client))
        rules.try_emplace(ExportClientKey(entry.client), NamedRule{&line, entry.client});
    }
  }
  return rules;
}

VORN::HealthSubject SubjectOf(const NamedRule& rule) {
  VORN::HealthSubject subject = rule.line->Subject();
  subject.client = rule.client;
  return subject;
}

// The addresses that the platform and the kernel remember.
Result<HostAddresses> ReadKnownHosts(Box& box) {
  Result<HostAddresses> hosts = ReadExportHosts(box);
  if (!hosts.ok()) return hosts;
  const Result<std::string> caches = box.root().Locate(kKernelCaches);
  if (caches.ok()) AddServedHosts(KernelCache(*caches, kAddressesCache), &*hosts);
  return hosts;
}

std::map<std::string, std::set<std::string>> ReadHostsFile(const std::string& text) {
  std::map<std::string, std::set<std::string>> addresses;
  for (const HostsLine& host : ReadHosts(text)) {
    for (const std::string& name : host.names) addresses[ExportClientKey(name)].insert(ExportClientKey(host.address));
  }
  return addresses;
}

std::string Join(const std::set<std::string>& words) {
  std::string text;
  for (const std::string& word : words) text += (text.empty() ? "" : ", ") + word;
  return text;
}

}  // namespace

Status FindUnknownHosts(const HealthInput& input, Findings* findings) {
  const std::map<std::string, NamedRule> rules = RulesOfHosts(input);
  if (rules.empty()) return {};
  if (!IsServing(input.box)) {
    return Status::Failure(kUnsupported,
                           "The service does not run; its start asks the name service for the hosts in export rules.");
  }
  const Result<StoredFile> table = input.box.Read(kExportTable);
  if (!table.ok()) return table.status();
  const Result<HostAddresses> hosts = ReadKnownHosts(input.box);
  if (!hosts.ok()) return hosts.status();
  const auto update = PlanExportTable(input.files, table->text, BoxPaths(input.box.root()), *hosts);
  if (!update.ok()) return update.status();
  for (const std::string& name : update->unresolved) {
    const auto rule = rules.find(name);
    if (rule == rules.end() || hosts->count(name) != 0) continue;
    findings->Error(SubjectOf(rule->second),
                    "No address of the host " + rule->second.client + " in the rules of " +
                        rule->second.line->Exported() + " is known: the rule does not admit it.",
                    "Correct the name, or make the name service know it; then save the rules of the share.");
  }
  return {};
}

Status FindMovedHosts(const HealthInput& input, Findings* findings) {
  const std::map<std::string, NamedRule> rules = RulesOfHosts(input);
  if (rules.empty()) return {};
  const Result<StoredFile> file = input.box.Read(kHosts);
  if (!file.ok()) return file.status();
  const Result<HostAddresses> known = ReadKnownHosts(input.box);
  if (!known.ok()) return known.status();
  const auto written = ReadHostsFile(file->text);
  std::size_t unknown = 0;
  for (const auto& [name, rule] : rules) {
    const auto now = written.find(name);
    const auto before = known->find(name);
    unknown += now == written.end() ? 1 : 0;
    if (now == written.end() || before == known->end()) continue;
    const std::set<std::string> used(before->second.begin(), before->second.end());
    const bool is_used = std::all_of(now->second.begin(), now->second.end(),
                                     [&](const std::string& address) { return used.count(address) != 0; });
    if (is_used) continue;
    findings->Warning(SubjectOf(rule),
                      "The host " + rule.client + " is at " + Join(now->second) + " in " + kHosts +
                          ", and the rules of " + rule.line->Exported() + " admit it at " + Join(used) + ".",
                      "Wait for the next run of vorn-nfs-names, which applies the new address, or correct " +
                          std::string(kHosts) + ".");
  }
  if (unknown == 0) return {};
  return Status::Failure(kUnsupported,
                         "Whether all hosts in export rules still have their addresses is known to the name "
                         "service only, which vorn-nfs-names asks regularly; not in /etc/hosts: " +
                             std::to_string(unknown) + ".");
}

}  // namespace vorn
