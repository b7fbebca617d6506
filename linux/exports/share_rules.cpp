#include "share_rules.h"

#include <cstring>
#include <map>
#include <memory>
#include <set>
#include <utility>

#include "box_paths.h"
#include "configuration_lock.h"
#include "crossed_volumes.h"
#include "exports_client.h"
#include "exports_document.h"
#include "exports_rule.h"
#include "notice.h"

namespace vorn {
namespace {

// The rule of a client in a file of /etc/exports.d.
struct ForeignEntry {
  ExportEntry entry;
  std::string place;  // of its line
};

// The contents of the files about one share. The foreign entries include those that an own entry overrides.
struct ShareExports {
  std::vector<ExportLine> own_lines;
  std::vector<ExportEntry> own;
  std::vector<ForeignEntry> foreign;  // in order, each client once

  // The rules in force.
  std::vector<ExportEntry> Entries() const;
};

std::vector<ExportEntry> ShareExports::Entries() const {
  std::vector<ExportEntry> entries = own;
  std::set<std::string> clients;
  for (const ExportEntry& entry : own) clients.insert(ExportClientKey(entry.client));
  for (const ForeignEntry& foreign_entry : foreign) {
    if (clients.count(ExportClientKey(foreign_entry.entry.client)) == 0) entries.push_back(foreign_entry.entry);
  }
  return entries;
}

// The first of `files` is the one that may be written.
ShareExports ExportsOf(const std::vector<SharedExportsFile>& files, const std::string& path, const ExportPaths& paths) {
  ShareExports share;
  share.own_lines = files.front()->document.LinesOf(path, paths);
  share.own = EntriesOf(share.own_lines);
  std::set<std::string> clients;
  for (auto file = files.begin() + 1; file != files.end(); ++file) {
    for (const ExportLine& line : (*file)->document.LinesOf(path, paths)) {
      for (const ExportEntry& entry : line.entries) {
        if (!clients.insert(ExportClientKey(entry.client)).second) continue;
        share.foreign.push_back({entry, (*file)->Place(line.span.path)});
      }
    }
  }
  return share;
}

// Turns the rules of a list into the entries that /etc/exports must have.
class RuleWriter {
 public:
  RuleWriter(const ShareExports& share, const SquashAccounts& accounts) : accounts_(accounts) {
    for (const ExportEntry& entry : share.own) own_.emplace(ExportClientKey(entry.client), &entry);
    for (const ForeignEntry& entry : share.foreign) foreign_.emplace(ExportClientKey(entry.entry.client), &entry);
  }

  // A cyclic list ends with a refusal at the first client that is repeated.
  Status Add(const ExportRule& rule) {
    const std::string client(rule.client, strnlen(rule.client, sizeof rule.client));
    if (client.size() == sizeof rule.client) return Status::Failure(kRefusedText, "an export client without an end");
    const std::string key = ExportClientKey(client);
    const auto own = own_.find(key);
    const auto foreign = foreign_.find(key);
    const ExportEntry* present = own != own_.end() ? own->second : nullptr;
    if (present == nullptr && foreign != foreign_.end()) present = &foreign->second->entry;
    // A client that a file has already is not validated again, so that an old rule can be saved unchanged.
    Status status = present != nullptr ? Status() : CheckExportClient(client);
    if (status.ok()) status = CheckDouble(client, present != nullptr);
    if (!status.ok()) return status;
    Result<ExportEntry> entry = EntryOf(rule, present, accounts_);
    if (!entry.ok()) return entry.status();
    if (present == nullptr || own != own_.end()) {
      entries_.push_back(std::move(*entry));
    } else if (!(*entry == *present)) {
      return RefuseForeign(*foreign->second, "changed");
    }
    return {};
  }

  // To be called after the last rule.
  Status CheckForeign() const {
    for (const auto& [key, entry] : foreign_) {
      if (clients_.count(key) == 0) return RefuseForeign(*entry, "removed");
    }
    return {};
  }

  const std::vector<ExportEntry>& entries() const { return entries_; }

 private:
  static Status RefuseForeign(const ForeignEntry& entry, const std::string& how) {
    return Status::Failure(kRefusedText, "the export rule of \"" + entry.entry.client + "\" is in another file, " +
                                             entry.place + ", and can only be " + how + " there");
  }

  // Two spellings of one network are a mistake, unless the files had both.
  Status CheckDouble(const std::string& client, bool present) {
    const bool new_client = clients_.insert(ExportClientKey(client)).second;
    const auto [network, new_network] = networks_.emplace(ExportNetworkKey(client), present);
    if (new_client && (new_network || (present && network->second))) return {};
    return Status::Failure(kRefusedText, "two export rules for \"" + client + "\"");
  }

  const SquashAccounts& accounts_;
  std::map<std::string, const ExportEntry*> own_;
  std::map<std::string, const ForeignEntry*> foreign_;
  std::set<std::string> clients_;
  std::map<std::string, bool> networks_;  // whether a file had the first client of each
  std::vector<ExportEntry> entries_;
};

// Faults are named with the file's location here, which a document does not know.
Status CheckUnderstood(const ExportsFile& file, const std::vector<ExportLine>& lines) {
  for (const ExportLine& line : lines) {
    if (!line.fault) continue;
    return Status::Failure(kRefusedText, file.Place(line.fault->position) + ": " + line.fault->reason +
                                             "; this line must be mended before it can be changed");
  }
  return {};
}

// Whether the caller removes all rules of the share. Faulty lines are then removed, too; a save that only keeps the
// rules of other files must not do that.
bool RemovesAll(const ExportRuleList* list) { return list == nullptr || list->first == nullptr; }

Status WriteEntries(Box& box, const ExportsFile& file, const std::string& path, const ShareExports& share,
                    const std::vector<ExportEntry>& entries, bool removes_all) {
  const bool removes_line = removes_all && !share.own_lines.empty();
  if (share.own == entries && !removes_line) return box.Confirm(kExportsFile);
  if (Status status = removes_all ? Status() : CheckUnderstood(file, share.own_lines); !status.ok()) return status;
  const Result<ExportsDocument> edited = file.document.Replace(path, entries, BoxPaths(box.root()));
  return edited.ok() ? box.Replace(kExportsFile, edited->text(), file.version) : edited.status();
}

Result<std::vector<SharedExportsFile>> OpenExports(Box& box, const std::string& path) {
  if (path == kExportsFile) return OpenAllExports(box);
  Result<SharedExportsFile> file = OpenExportsFile(box, path);
  if (!file.ok()) return file.status();
  return std::vector<SharedExportsFile>{std::move(*file)};
}

}  // namespace

Result<std::vector<ExportRule>> ReadShareRules(Box& box, const std::string& file, const std::string& path) {
  const Result<std::vector<SharedExportsFile>> files = OpenExports(box, file);
  if (!files.ok()) return files.status();
  const std::vector<ExportEntry> entries = ExportsOf(*files, path, BoxPaths(box.root())).Entries();
  std::vector<ExportRule> rules;
  if (entries.empty()) return rules;
  const Result<SquashAccounts> accounts = SquashAccounts::Load(box);
  if (!accounts.ok()) return accounts.status();
  for (const ExportEntry& entry : entries) rules.push_back(RuleOf(entry, *accounts));
  return rules;
}

Status WriteShareRules(Box& box, const std::string& path, const ExportRuleList* list) {
  const ConfigurationLock lock(box);
  if (!lock.status().ok()) return lock.status();
  const Result<std::vector<SharedExportsFile>> files = OpenAllExports(box);
  if (!files.ok()) return files.status();
  const Result<SquashAccounts> accounts = SquashAccounts::Load(box);
  if (!accounts.ok()) return accounts.status();
  const ShareExports share = ExportsOf(*files, path, BoxPaths(box.root()));
  RuleWriter writer(share, *accounts);
  for (const ExportRule* rule = list == nullptr ? nullptr : list->first; rule != nullptr; rule = rule->next) {
    if (Status status = writer.Add(*rule); !status.ok()) return status;
  }
  if (Status status = writer.CheckForeign(); !status.ok()) return status;
  const std::vector<ExportEntry>& entries = writer.entries();
  Status status = WriteEntries(box, *files->front(), path, share, entries, RemovesAll(list));
  if (!status.ok()) return status;
  for (const std::string& sentence : DescribeCrossedVolumes(box, *files, path, entries)) Notice(sentence);
  return {};
}

}  // namespace vorn
