// Export rules, in exports(5): one line per share.
//
// A fault in another line of the file does not keep a rule from being written. exportfs(8) drops what
// follows the fault, with or without the new line, so the file is no worse than before, and one
// administrator's slip must not keep all others from closing an export. It does not stay unseen
// either: the reload that follows finds the table short of the file and names the faulty line.
#include "exports.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "error.h"
#include "exports_client.h"
#include "exports_document.h"
#include "exports_rule.h"
#include "exports_table.h"
#include "files.h"
#include "lock.h"
#include "nfsconf.h"
#include "root.h"

namespace vorn {
namespace {

constexpr const char* kExportsFile = "/etc/exports";
constexpr const char* kExportTable = "/var/lib/nfs/etab";

struct FreeRules {
  void operator()(ExportRuleList* list) const { VORNNFSRuleExtFree(list); }
};
using RuleList = std::unique_ptr<ExportRuleList, FreeRules>;

// A file below the root, and where it is.
struct LocatedFile {
  std::string path;
  FileText content;
};

Result<LocatedFile> ReadBelowRoot(const std::string& path) {
  auto located = Root::Current().Locate(path);
  if (!located.ok()) return located.status();
  auto file = ReadFileOrNothing(*located);
  if (!file.ok()) return file.status();
  return LocatedFile{std::move(*located), std::move(*file)};
}

template <typename Record>
Record* Allocate() {
  return static_cast<Record*>(std::calloc(1, sizeof(Record)));
}

Result<RuleList> ListOf(const std::string& path, const std::vector<ExportEntry>& entries,
                        const SquashAccounts& accounts) {
  RuleList list(Allocate<ExportRuleList>());
  if (!list) return Status::System(ENOMEM, "export rules");
  path.copy(list->path, sizeof list->path - 1);
  ExportRule** last = &list->first;
  for (const ExportEntry& entry : entries) {
    *last = Allocate<ExportRule>();
    if (*last == nullptr) return Status::System(ENOMEM, "export rules");
    **last = RuleOf(entry, accounts);
    last = &(*last)->next;
  }
  return list;
}

// Null where the share has no rule.
Result<RuleList> ReadRules(const char* file, const char* path) {
  auto exports = ReadBelowRoot(file);
  if (!exports.ok()) return exports.status();
  const auto entries = ExportsDocument(std::move(exports->content.text)).Entries(path);
  if (entries.empty()) return RuleList();
  const auto accounts = SquashAccounts::Load();
  if (!accounts.ok()) return accounts.status();
  return ListOf(path, entries, *accounts);
}

// Turns the rules of a list into entries, beside the share's present ones.
class RuleWriter {
 public:
  RuleWriter(const std::vector<ExportEntry>& present, const SquashAccounts& accounts) : accounts_(accounts) {
    for (const ExportEntry& entry : present) present_.emplace(ExportClientKey(entry.client), &entry);
  }

  // A list that never ends is refused at the first client that comes again.
  Status Add(const ExportRule& rule) {
    const std::string client(rule.client, strnlen(rule.client, sizeof rule.client));
    if (client.size() == sizeof rule.client) return Status::Failure(kRefusedText, "an export client without an end");
    const auto found = present_.find(ExportClientKey(client));
    const ExportEntry* present = found == present_.end() ? nullptr : found->second;
    // What the file has already is not judged again: it is no worse for being written once more.
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

Status WriteRules(const char* path, const ExportRuleList* list) {
  if (path == nullptr || path[0] != '/') return Status::Failure(EINVAL, "the path of an export is not absolute");
  const ConfigurationLock lock;
  if (!lock.status().ok()) return lock.status();
  auto file = ReadBelowRoot(kExportsFile);
  if (!file.ok()) return file.status();
  const auto accounts = SquashAccounts::Load();
  if (!accounts.ok()) return accounts.status();
  ExportsDocument exports(std::move(file->content.text));
  const auto present = exports.Entries(path);
  RuleWriter writer(present, *accounts);
  for (const ExportRule* rule = list == nullptr ? nullptr : list->first; rule != nullptr; rule = rule->next) {
    Status status = writer.Add(*rule);
    if (!status.ok()) return status;
  }
  if (present == writer.entries()) return ConfirmFile(file->path);
  Status status = exports.Replace(path, writer.entries());
  return status.ok() ? ReplaceFile(file->path, exports.text(), file->content.stamp) : status;
}

std::string Resolved(const std::string& path) {
  const Root root = Root::Current();
  const auto located = root.Locate(path);
  return located.ok() ? root.OnBox(*located) : path;
}

}  // namespace

Result<FileStamp> ExportsFileStamp() {
  const auto file = ReadBelowRoot(kExportsFile);
  if (!file.ok()) return file.status();
  return file->content.stamp;
}

Status CheckExportTable(const FileStamp& reloaded) {
  auto file = ReadBelowRoot(kExportsFile);
  if (!file.ok()) return file.status();
  if (!IsSameFile(file->content.stamp, reloaded)) return {};
  auto table = ReadBelowRoot(kExportTable);
  if (!table.ok()) return table.status();
  return CompareExportTable(ExportsDocument(std::move(file->content.text)),
                            ExportsDocument(std::move(table->content.text)), Resolved);
}

}  // namespace vorn

extern "C" {

int VORNNFSRuleExtGet(const char* file, const char* path, ExportRuleList** list) {
  auto rules = vorn::ReadRules(file, path);
  if (!rules.ok()) return vorn::ToResult(rules.status());
  if (!*rules) return 0;
  int count = 0;
  for (const ExportRule* rule = (*rules)->first; rule != nullptr; rule = rule->next) ++count;
  *list = rules->release();
  return count;
}

int VORNNFSRuleExtSetAll(const char* path, const ExportRuleList* list) {
  return vorn::ToResult(vorn::WriteRules(path, list));
}

void VORNNFSRuleExtFree(ExportRuleList* list) {
  if (list == nullptr) return;
  for (ExportRule* rule = list->first; rule != nullptr;) std::free(std::exchange(rule, rule->next));
  std::free(list);
}

}  // extern "C"
