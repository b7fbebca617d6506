#include "share_rules.h"

#include <cerrno>
#include <cstring>
#include <map>
#include <set>
#include <utility>

#include "configuration_lock.h"
#include "exports_client.h"
#include "exports_document.h"
#include "exports_rule.h"
#include "exports_table.h"

namespace vorn {
namespace {

constexpr char kExportsFile[] = "/etc/exports";
constexpr char kExportTable[] = "/var/lib/nfs/etab";

// Turns the rules of a list into entries, beside the share's present ones.
class RuleWriter {
 public:
  RuleWriter(const std::vector<ExportEntry>& present, const SquashAccounts& accounts) : accounts_(accounts) {
    for (const ExportEntry& entry : present) present_.emplace(ExportClientKey(entry.client), &entry);
  }

  // A cyclic list ends with a refusal at the first client that is repeated.
  Status Add(const ExportRule& rule) {
    const std::string client(rule.client, strnlen(rule.client, sizeof rule.client));
    if (client.size() == sizeof rule.client) return Status::Failure(kRefusedText, "an export client without an end");
    const auto found = present_.find(ExportClientKey(client));
    const ExportEntry* present = found == present_.end() ? nullptr : found->second;
    // A client that the file has already is not validated again, so that an old rule can be saved unchanged.
    Status status = present != nullptr ? Status() : CheckExportClient(client);
    if (status.ok()) status = CheckDouble(client, present != nullptr);
    if (!status.ok()) return status;
    auto entry = EntryOf(rule, present, accounts_);
    if (!entry.ok()) return entry.status();
    entries_.push_back(std::move(*entry));
    return {};
  }

  const std::vector<ExportEntry>& entries() const { return entries_; }

 private:
  // Two spellings of one network are a mistake, unless the file had both.
  Status CheckDouble(const std::string& client, bool present) {
    const bool new_client = clients_.insert(ExportClientKey(client)).second;
    const auto [network, new_network] = networks_.emplace(ExportNetworkKey(client), present);
    if (new_client && (new_network || (present && network->second))) return {};
    return Status::Failure(kRefusedText, "two export rules for \"" + client + "\"");
  }

  const SquashAccounts& accounts_;
  std::map<std::string, const ExportEntry*> present_;
  std::set<std::string> clients_;
  std::map<std::string, bool> networks_;  // whether the file had the first of each
  std::vector<ExportEntry> entries_;
};

// The path of a line of the table, without links.
PathResolver ResolverOf(const Root& root) {
  return [root](const std::string& path) {
    const auto located = root.Locate(path);
    return located.ok() ? root.OnBox(*located) : path;
  };
}

}  // namespace

Result<std::vector<ExportRule>> ReadShareRules(Box& box, const std::string& file, const std::string& path) {
  auto exports = box.Read(file);
  if (!exports.ok()) return exports.status();
  const auto entries = ExportsDocument(std::move(exports->text)).Entries(path);
  std::vector<ExportRule> rules;
  if (entries.empty()) return rules;
  const auto accounts = SquashAccounts::Load(box);
  if (!accounts.ok()) return accounts.status();
  for (const ExportEntry& entry : entries) rules.push_back(RuleOf(entry, *accounts));
  return rules;
}

Status WriteShareRules(Box& box, const std::string& path, const ExportRuleList* list) {
  const ConfigurationLock lock(box);
  if (!lock.status().ok()) return lock.status();
  auto file = box.Read(kExportsFile);
  if (!file.ok()) return file.status();
  const auto accounts = SquashAccounts::Load(box);
  if (!accounts.ok()) return accounts.status();
  ExportsDocument exports(std::move(file->text));
  const auto present = exports.Entries(path);
  RuleWriter writer(present, *accounts);
  for (const ExportRule* rule = list == nullptr ? nullptr : list->first; rule != nullptr; rule = rule->next) {
    if (Status status = writer.Add(*rule); !status.ok()) return status;
  }
  if (present == writer.entries()) return box.Confirm(kExportsFile);
  const Status status = exports.Replace(path, writer.entries());
  return status.ok() ? box.Replace(kExportsFile, exports.text(), file->version) : status;
}

Result<Version> ReadExportsVersion(Box& box) {
  const auto file = box.Read(kExportsFile);
  if (!file.ok()) return file.status();
  return file->version;
}

Status CheckExportTable(Box& box, const Version& reloaded) {
  auto file = box.Read(kExportsFile);
  if (!file.ok()) return file.status();
  if (file->version != reloaded) return {};
  auto table = box.Read(kExportTable);
  if (!table.ok()) return table.status();
  return CompareExportTable(ExportsDocument(std::move(file->text)), ExportsDocument(std::move(table->text)),
                            ResolverOf(box.root()));
}

}  // namespace vorn
