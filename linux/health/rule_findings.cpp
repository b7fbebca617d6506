#include "rule_findings.h"

#include <sys/types.h>

#include <algorithm>
#include <cstddef>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

#include "box_paths.h"
#include "crossed_volumes.h"
#include "export_decision.h"
#include "exports_client.h"
#include "folder_path.h"
#include "mount_table.h"

namespace vorn {
namespace {

// A rule and where it is written.
struct Rule {
  const ExportedLine* line = nullptr;
  const ExportEntry* entry = nullptr;
};

std::vector<Rule> RulesOf(const HealthInput& input, const std::vector<std::size_t>& lines) {
  std::vector<Rule> rules;
  for (const std::size_t at : lines) {
    const ExportedLine& line = input.exported[at];
    for (const ExportEntry& entry : line.line->entries) rules.push_back({&line, &entry});
  }
  return rules;
}

// The rules of a directory that count, by the key of their client.
using RulesByClient = std::unordered_map<std::string, Rule>;

RulesByClient RulesByClientOf(const HealthInput& input, const std::vector<std::size_t>& lines) {
  RulesByClient rules;
  for (const Rule& rule : RulesOf(input, lines)) rules.try_emplace(ExportClientKey(rule.entry->client), rule);
  return rules;
}

// The networks of one directory, as they come.
class Networks {
 public:
  // Returns the first of the earlier networks that contains all of this one, and adds this one. nullopt if there is
  // none.
  std::optional<Rule> Add(const Rule& rule) {
    if (ExportKindOf(rule.entry->client) != ExportKind::kNetwork) return std::nullopt;
    const auto network = ReadExportNetwork(rule.entry->client);
    if (!network) return std::nullopt;  // exportfs(8) does not accept it
    std::optional<Rule> found;
    for (const ExportNetwork::Address& mask : masks_) {
      ExportNetwork wider = *network;
      wider.mask = mask;
      if (!Contains(wider, *network)) continue;
      const auto earlier = rules_.find(ExportNetworkKey(wider));
      if (earlier != rules_.end()) found = earlier->second;
    }
    masks_.insert(network->mask);
    rules_.try_emplace(ExportNetworkKey(*network), rule);
    return found;
  }

 private:
  std::set<ExportNetwork::Address> masks_;
  std::unordered_map<std::string, Rule> rules_;
};

void AddHiddenRule(const Rule& hidden, const Rule& deciding, Findings* findings) {
  VORN::HealthSubject subject = hidden.line->Subject();
  subject.client = hidden.entry->client;
  findings->Warning(std::move(subject),
                    hidden.line->Name() + " has a rule for " + hidden.entry->client + " that has no effect on " +
                        hidden.line->Exported() + ": the earlier rule for " + deciding.entry->client + " in line " +
                        std::to_string(deciding.line->number) + " of " + deciding.line->file->path + " decides.",
                    "Put the narrower rule first, or remove it.");
}

// Returns the nearest exported directory around `directory` on the same file system; "" if there is none.
std::string FindOuter(const HealthInput& input, const std::set<std::string>& mounts, const std::string& directory) {
  const std::vector<std::string> way = WayTo(directory);
  for (std::size_t at = way.size() - 1; at > 0 && mounts.count(way[at]) == 0; --at) {
    if (input.lines_of.count(way[at - 1]) != 0) return way[at - 1];
  }
  return "";
}

std::string Join(const std::vector<std::string>& words) {
  std::string text;
  for (const std::string& word : words) text += (text.empty() ? "" : ", ") + word;
  return text;
}

// The clients of `outer` that `inner` has no equal rule for; the first few of them.
std::vector<std::string> ForeignClients(const RulesByClient& outer, const RulesByClient& inner) {
  constexpr std::size_t kNamed = 3;
  std::vector<std::string> clients;
  for (const auto& [key, rule] : outer) {
    const auto own = inner.find(key);
    if (own != inner.end() && own->second.entry->options == rule.entry->options) continue;
    clients.push_back(rule.entry->client);
  }
  std::sort(clients.begin(), clients.end());
  if (clients.size() > kNamed) {
    const std::string others = std::to_string(clients.size() - kNamed) + " others";
    clients.resize(kNamed);
    clients.push_back(others);
  }
  return clients;
}

// The clients of a directory as one string; empty if no rule leaves its files unchecked.
std::string ClientsWithoutSubtreeCheck(const RulesByClient& rules) {
  std::set<std::string> clients;
  bool is_checked = true;
  for (const auto& [key, rule] : rules) {
    const std::vector<std::string>& others = rule.entry->options.others;
    is_checked = is_checked && std::find(others.begin(), others.end(), "subtree_check") != others.end();
    clients.insert(key);
  }
  if (is_checked) return "";
  return Join({clients.begin(), clients.end()});
}

// A share and its clients.
struct Export {
  const SharedFolder* share = nullptr;
  std::string clients;
};

}  // namespace

Status FindNarrowNetworks(const HealthInput& input, Findings* findings) {
  for (const ExportedLine& line : input.exported) {
    for (const ExportEntry& entry : line.line->entries) {
      if (!HasPrefixOfLengthZero(entry.client)) continue;
      VORN::HealthSubject subject = line.Subject();
      subject.client = entry.client;
      const bool is_ipv4 = entry.client.find(':') == std::string::npos;
      findings->Warning(std::move(subject),
                        line.Name() + " has a rule for " + entry.client + " on " + line.Exported() +
                            ". rpc.mountd takes a prefix of length 0 for one of 32 bits on most processors, so that " +
                            (is_ipv4 ? "only this address" : "only this network of 32 bits") + " is admitted.",
                        std::string("Write ") +
                            (is_ipv4 ? "0.0.0.0/0.0.0.0 for all of IPv4" : "::/:: for all of IPv6") +
                            ", or \"*\" for every client.");
    }
  }
  return {};
}

Status FindHiddenRules(const HealthInput& input, Findings* findings) {
  for (const ExportedLine& first : input.exported) {
    const std::vector<std::size_t>& lines = input.lines_of.at(first.directory);
    if (&input.exported[lines.front()] != &first) continue;
    RulesByClient rules;
    Networks networks;
    for (const Rule& rule : RulesOf(input, lines)) {
      const auto [earlier, is_new] = rules.try_emplace(ExportClientKey(rule.entry->client), rule);
      const std::optional<Rule> deciding = is_new ? networks.Add(rule) : earlier->second;
      if (deciding && !(deciding->entry->options == rule.entry->options)) AddHiddenRule(rule, *deciding, findings);
    }
  }
  return {};
}

Status FindCrossedVolumes(const HealthInput& input, Findings* findings) {
  const Result<MountTable> table = MountTable::Read(input.box);
  if (!table.ok()) return table.status();
  const std::vector<std::string> mounts = table->FoldersBelow("/");
  const BoxPaths paths(input.box.root());
  for (const auto& exported : input.exported) {
    for (CrossedVolume& crossed :
         FindCrossedVolumes(mounts, input.files, exported.directory, exported.line->entries, paths)) {
      VORN::HealthSubject subject = exported.Subject();
      subject.client = crossed.clients.front();
      findings->Warning(std::move(subject),
                        "The option crossmnt of " + exported.directory + " also opens " + crossed.volume + " to " +
                            Join(crossed.clients) + ", which the rules of " + crossed.volume + " do not name.",
                        "Switch crossmnt off in the rules of " + exported.directory + ", or give " + crossed.volume +
                            " rules for these clients.");
    }
  }
  return {};
}

Status FindNestedShares(const HealthInput& input, Findings* findings) {
  const Result<MountTable> table = MountTable::Read(input.box);
  if (!table.ok()) return table.status();
  const std::vector<std::string> folders = table->FoldersBelow("/");
  const std::set<std::string> mounts(folders.begin(), folders.end());
  std::unordered_map<std::string, RulesByClient> rules;  // of outer directories
  for (const SharedFolder& share : input.shares) {
    const auto lines = input.lines_of.find(share.path);
    const std::string outer = lines == input.lines_of.end() ? "" : FindOuter(input, mounts, share.path);
    if (outer.empty()) continue;
    auto& around = rules[outer];
    if (around.empty()) around = RulesByClientOf(input, input.lines_of.at(outer));
    const std::vector<std::string> clients = ForeignClients(around, RulesByClientOf(input, lines->second));
    if (clients.empty()) continue;
    const ExportedLine& line = input.exported[lines->second.front()];
    std::string text = "The share \"" + share.name + "\" is inside " + outer;
    text.append(", which is exported, too. Over NFSv4 ").append(Join(clients));
    text.append(" reaches it with the rights of ").append(outer).append(", whatever its own rules say.");
    findings->Warning(line.Subject(), std::move(text),
                      "Give both the same rules, or put the share on a file system of its own.");
  }
  return {};
}

Status FindSharedFileSystems(const HealthInput& input, Findings* findings) {
  std::map<dev_t, Export> first;  // the first share of each file system
  std::set<dev_t> divided;        // file systems with different clients
  std::string pair;
  VORN::HealthSubject subject;
  for (std::size_t at = 0; at < input.shares.size(); ++at) {
    const SharedFolder& share = input.shares[at];
    const auto lines = input.lines_of.find(share.path);
    if (lines == input.lines_of.end() || !input.devices[at]) continue;
    const std::string clients = ClientsWithoutSubtreeCheck(RulesByClientOf(input, lines->second));
    if (clients.empty()) continue;
    const dev_t device = *input.devices[at];
    const Export& other = first.try_emplace(device, Export{&share, clients}).first->second;
    if (other.clients == clients || !divided.insert(device).second || !pair.empty()) continue;
    pair = "\"" + other.share->name + "\" and \"" + share.name + "\"";
    subject.share = share.name;
  }
  if (divided.empty()) return {};
  const std::string more = divided.size() == 1 ? "" : ", and those of other file systems, too";
  findings->Notice(std::move(subject),
                   "The shares " + pair + " are on one file system and have different clients" + more +
                       ". A client whose root is hostile can guess file handles, and so read files of a share that is "
                       "not exported to it.",
                   "Put shares for clients that do not trust each other on file systems of their own.");
  return {};
}

}  // namespace vorn
