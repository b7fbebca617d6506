#include "nfsconf.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "configuration_lock.h"
#include "current_box.h"
#include "error.h"
#include "host_domain.h"
#include "idmap.h"
#include "kerberos_support.h"
#include "keytab.h"
#include "lists.h"
#include "live_settings.h"
#include "nfs_record.h"
#include "owned.h"
#include "share_rules.h"
#include "unicode.h"

namespace vorn {
namespace {

// ---------------------------------------------------------------------------------------------
// The NFS configuration record.

Status GetRecord(NFSConfRecord* record) {
  if (record == nullptr) return Status::Failure(EINVAL, "no record");
  const Result<NFSConfRecord> stored = ReadNFSRecord(CurrentBox());
  if (stored.ok()) *record = *stored;
  return stored.status();
}

Status SetRecord(const NFSConfRecord* record) {
  if (record == nullptr) return Status::Failure(EINVAL, "no record");
  return WriteNFSRecord(CurrentBox(), *record);
}

// ---------------------------------------------------------------------------------------------
// The ID-map record.

// The private state of an ID-map record; stored in `platform[0]`.
struct IDMapState {
  explicit IDMapState(Box& box) : lock(box) {}

  ConfigurationLock lock;
  std::string domain;  // the one that the record was given
};

IDMapState* StateOf(const _tag_nfs_id_map_& record) { return static_cast<IDMapState*>(record.platform[0]); }

using IDMapRecord = Owned<_tag_nfs_id_map_, VORNNFSIDMapFree>;

// A rehearsal starts nothing, also no question to a name server.
std::string DefaultDomain(const Box& box) {
  HostDomain& domain = HostDomain::OfThisHost();
  return box.is_draft() ? domain.Last() : domain.Get();
}

Result<IDMapRecord> GetIDMap(Box& box) {
  IDMapRecord record(new _tag_nfs_id_map_{});
  auto* state = new IDMapState(box);
  record->platform[0] = state;
  if (!state->lock.status().ok()) return state->lock.status();
  const Result<std::shared_ptr<const IDMap>> map = ReadIDMap(box);
  if (!map.ok()) return map.status();
  state->domain = (*map)->domain() ? *(*map)->domain() : DefaultDomain(box);
  record->domain = strdup(state->domain.c_str());
  record->table = KLIBCSzHashAlloc(0);
  if (record->domain == nullptr || record->table == nullptr) return Status::System(ENOMEM, kIDMapFile);
  if (Status status = AddAll((*map)->mappings(), record->table); !status.ok()) return status;
  return record;
}

// A default domain that the caller left alone is not stored.
std::optional<std::string> ChangedDomain(const _tag_nfs_id_map_& record, const IDMapState* state) {
  if (record.domain == nullptr || (state != nullptr && record.domain == state->domain)) return std::nullopt;
  return record.domain;
}

Status SetIDMap(const char* path, const _tag_nfs_id_map_* record) {
  if (path == nullptr || record == nullptr) return Status::Failure(EINVAL, "no path, or no record");
  IDMapState* state = StateOf(*record);
  IDMapChange change;
  change.domain = ChangedDomain(*record, state);
  if (record->table != nullptr) change.mappings = TableOf(*record->table);
  Status status = WriteIDMap(CurrentBox(), path, change);
  if (status.ok() && state != nullptr && record->domain != nullptr) state->domain = record->domain;
  return status;
}

Status GetStaticMappings(KLIBSZHASH** hash, const char* filter) {
  if (hash == nullptr || *hash == nullptr) return Status::Failure(EINVAL, "no hash");
  const Result<std::shared_ptr<const IDMap>> map = ReadIDMap(CurrentBox());
  if (!map.ok()) return map.status();
  return AddAll((*map)->Matching(filter == nullptr ? "" : filter), *hash);
}

Status AppendPairs(KLIBSZHASH** table, const KLIBSZHASH* pairs) {
  if (table == nullptr || *table == nullptr || pairs == nullptr) {
    return Status::Failure(EINVAL, "no table, or no pairs");
  }
  return AddAll(TableOf(*pairs), *table);
}

Status RemovePrincipals(KLIBSZHASH* table, const KLIBSZLIST* principals) {
  if (table == nullptr || principals == nullptr) return Status::Failure(EINVAL, "no table, or no principals");
  for (int i = 0; i < principals->count; ++i) KLIBCSzHashRemoveKey(table, KLIBCSzListGet(principals, i));
  return {};
}

// ---------------------------------------------------------------------------------------------
// Keytabs.

using Entries = Owned<KeytabEntry, VORNNFSKeytabInfoFree>;

Status ListKeys(const char* path, KeytabEntry** list) {
  if (path == nullptr || list == nullptr) return Status::Failure(EINVAL, "no path, or no list");
  const Result<std::vector<KeytabKey>> keys = ListKeytab(CurrentBox(), path);
  if (!keys.ok()) return keys.status();
  Entries entries;
  for (auto key = keys->rbegin(); key != keys->rend(); ++key) {
    Entries entry(new KeytabEntry{});
    entry->version = key->version;
    snprintf(entry->principal, sizeof entry->principal, "%s", ToValidUtf8(key->principal).c_str());
    snprintf(entry->enc_type, sizeof entry->enc_type, "%s", key->enc_type.c_str());
    entry->next = entries.release();
    entries = std::move(entry);
  }
  *list = entries.release();
  return {};
}

// ---------------------------------------------------------------------------------------------
// Export rules.

using RuleList = Owned<ExportRuleList, VORNNFSRuleExtFree>;

template <typename Record>
Record* Allocate() {
  return static_cast<Record*>(std::calloc(1, sizeof(Record)));
}

// A path that does not fit into a list's field is refused: cut, it would be the path of another share.
Status CheckSharePath(const std::string& path) {
  if (path.empty() || path[0] != '/') return Status::Failure(EINVAL, "the path of an export is not absolute");
  return path.size() < sizeof ExportRuleList::path ? Status() : Status::System(ENAMETOOLONG, "export of " + path);
}

Result<RuleList> ToRuleList(const std::string& path, const std::vector<ExportRule>& rules) {
  RuleList list(Allocate<ExportRuleList>());
  if (!list) return Status::System(ENOMEM, "export rules");
  path.copy(list->path, sizeof list->path - 1);
  ExportRule** last = &list->first;
  for (const ExportRule& rule : rules) {
    *last = Allocate<ExportRule>();
    if (*last == nullptr) return Status::System(ENOMEM, "export rules");
    **last = rule;
    last = &(*last)->next;
  }
  return list;
}

// The number of rules.
Result<int> GetRules(const char* file, const char* path, ExportRuleList** list) {
  if (file == nullptr || path == nullptr || list == nullptr) return Status::Failure(EINVAL, "no file, path or list");
  if (Status status = CheckSharePath(path); !status.ok()) return status;
  const Result<std::vector<ExportRule>> rules = ReadShareRules(CurrentBox(), file, path);
  if (!rules.ok()) return rules.status();
  if (rules->empty()) return 0;
  Result<RuleList> made = ToRuleList(path, *rules);
  if (!made.ok()) return made.status();
  *list = made->release();
  return static_cast<int>(rules->size());
}

Status SetRules(const char* path, const ExportRuleList* list) {
  if (path == nullptr) return Status::Failure(EINVAL, "no path");
  if (Status status = CheckSharePath(path); !status.ok()) return status;
  return WriteShareRules(CurrentBox(), path, list);
}

}  // namespace
}  // namespace vorn

using vorn::CurrentBox;
using vorn::ToResult;

int VORNNFSConfGet(NFSConfRecord* record) { return ToResult(vorn::GetRecord(record)); }

int VORNNFSConfSet(const NFSConfRecord* record) { return ToResult(vorn::SetRecord(record)); }

int VORNNFSUDPPrefSizeSet(int read_size, int write_size) {
  return ToResult(vorn::ApplyTransferSizes(CurrentBox(), read_size, write_size));
}

int VORNNFSUNIXPriEnableSet(int enable) { return ToResult(vorn::ApplyUnixPermissions(CurrentBox(), enable != 0)); }

_tag_nfs_id_map_* VORNNFSIDMapGet() {
  vorn::Result<vorn::IDMapRecord> record = vorn::GetIDMap(CurrentBox());
  if (record.ok()) return record->release();
  ToResult(record.status());
  return nullptr;
}

int VORNNFSIDMapSet(const char* path, const _tag_nfs_id_map_* record) { return ToResult(vorn::SetIDMap(path, record)); }

void VORNNFSIDMapFree(_tag_nfs_id_map_* record) {
  if (record == nullptr) return;
  std::free(record->domain);
  KLIBCSzHashFree(record->table);
  delete vorn::StateOf(*record);
  delete record;
}

int VORNNFSStaticMapGet(KLIBSZHASH** hash, const char* filter) {
  return ToResult(vorn::GetStaticMappings(hash, filter));
}

int VORNNFSStaticMapAppend(KLIBSZHASH** table, const KLIBSZHASH* pairs) {
  return ToResult(vorn::AppendPairs(table, pairs));
}

int VORNNFSStaticMapRemove(KLIBSZHASH* table, const KLIBSZLIST* principals) {
  return ToResult(vorn::RemovePrincipals(table, principals));
}

int VORNNFSSupportKerberos(void) {
  const vorn::Result<bool> supported = vorn::SupportsKerberos(CurrentBox());
  if (supported.ok()) return *supported ? 1 : 0;
  ToResult(supported.status());
  return 0;  // any other value would mean "supported"
}

int VORNNFSKeytabImport(const char* path) {
  const vorn::Status status = vorn::ImportKeytab(CurrentBox(), path == nullptr ? "" : path);
  if (ToResult(status) == 0) return 0;
  return status.code() == vorn::kNoKeytab ? VORNNFS_KEYTAB_NO_KEYTAB : VORNNFS_KEYTAB_FAILED;
}

int VORNNFSKeytabInfoGet(const char* path, KeytabEntry** list) { return ToResult(vorn::ListKeys(path, list)); }

void VORNNFSKeytabInfoFree(KeytabEntry* list) {
  while (list != nullptr) delete std::exchange(list, list->next);
}

int VORNNFSRuleExtGet(const char* file, const char* path, ExportRuleList** list) {
  const vorn::Result<int> count = vorn::GetRules(file, path, list);
  return count.ok() ? *count : ToResult(count.status());
}

int VORNNFSRuleExtSetAll(const char* path, const ExportRuleList* list) { return ToResult(vorn::SetRules(path, list)); }

void VORNNFSRuleExtFree(ExportRuleList* list) {
  if (list == nullptr) return;
  for (ExportRule* rule = list->first; rule != nullptr;) std::free(std::exchange(rule, rule->next));
  std::free(list);
}
