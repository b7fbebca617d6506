// The NFS configuration library of the fake platform, and the share, user, file-system and firewall libraries.
#include <cstdlib>
#include <cstring>

#include "fake_lists.h"
#include "fake_platform.h"
#include "filesystem.h"
#include "firewall.h"
#include "share.h"
#include "shared_folders.h"
#include "user.h"

struct VORNSHARE {
  std::string path;
};

namespace {

// Returns the pairs of a table as tests compare them.
Pairs PairsOf(const KLIBSZHASH* hash) { return hash == nullptr ? Pairs() : hash->pairs; }

ExportRuleList* CopyRules(const std::string& path, const std::vector<ExportRule>& rules) {
  auto* const list = static_cast<ExportRuleList*>(calloc(1, sizeof(ExportRuleList)));
  std::strncpy(list->path, path.c_str(), sizeof list->path - 1);
  ExportRule** end = &list->first;
  for (const ExportRule& rule : rules) {
    *end = static_cast<ExportRule*>(malloc(sizeof(ExportRule)));
    **end = rule;
    (*end)->next = nullptr;
    end = &(*end)->next;
  }
  FakePlatform::Current().Born("ExportRuleList");
  return list;
}

int Answered(const char* operation, const std::string& arguments) {
  FakePlatform& platform = FakePlatform::Current();
  return platform.Fails(operation, arguments) ? platform.FailureResult(operation) : platform.done;
}

}  // namespace

extern "C" {

int VORNNFSConfGet(NFSConfRecord* record) {
  FakePlatform& platform = FakePlatform::Current();
  if (platform.Fails("VORNNFSConfGet")) return -1;
  *record = platform.record;
  return platform.done;
}

int VORNNFSConfSet(const NFSConfRecord* record) {
  FakePlatform& platform = FakePlatform::Current();
  if (platform.Fails("VORNNFSConfSet")) return -1;
  platform.record = *record;
  return platform.done;
}

int VORNNFSUDPPrefSizeSet(int read_size, int write_size) {
  return Answered("VORNNFSUDPPrefSizeSet", std::to_string(read_size) + " " + std::to_string(write_size));
}

int VORNNFSUNIXPriEnableSet(int enable) { return Answered("VORNNFSUNIXPriEnableSet", std::to_string(enable)); }

_tag_nfs_id_map_* VORNNFSIDMapGet(void) {
  FakePlatform& platform = FakePlatform::Current();
  if (platform.Fails("VORNNFSIDMapGet")) return nullptr;
  auto* const record = static_cast<_tag_nfs_id_map_*>(calloc(1, sizeof(_tag_nfs_id_map_)));
  if (platform.has_domain) record->domain = strdup(platform.domain.c_str());
  if (platform.has_table) {
    record->table = MakeHash();
    record->table->pairs = platform.mappings;
  }
  platform.Born("_tag_nfs_id_map_");
  return record;
}

int VORNNFSIDMapSet(const char* path, const _tag_nfs_id_map_* record) {
  FakePlatform& platform = FakePlatform::Current();
  if (platform.Fails("VORNNFSIDMapSet", path)) return -1;
  platform.domain = record->domain == nullptr ? "" : record->domain;
  platform.mappings = PairsOf(record->table);
  return platform.done;
}

void VORNNFSIDMapFree(_tag_nfs_id_map_* record) {
  FakePlatform& platform = FakePlatform::Current();
  platform.Record("VORNNFSIDMapFree");
  if (record == nullptr) return;
  if (record->table != nullptr) platform.Died("KLIBSZHASH");
  delete record->table;
  free(record->domain);
  free(record);
  platform.Died("_tag_nfs_id_map_");
}

int VORNNFSSupportKerberos(void) {
  FakePlatform::Current().Record("VORNNFSSupportKerberos");
  return FakePlatform::Current().kerberos_support;
}

int VORNNFSKeytabImport(const char* path) {
  FakePlatform& platform = FakePlatform::Current();
  if (platform.Fails("VORNNFSKeytabImport", path)) return platform.FailureResult("VORNNFSKeytabImport");
  return platform.keytab_import_result;
}

int VORNNFSKeytabInfoGet(const char* path, KeytabEntry** list) {
  FakePlatform& platform = FakePlatform::Current();
  const bool fails = platform.Fails("VORNNFSKeytabInfoGet", path);
  KeytabEntry** end = list;
  for (const KeytabEntry& entry : platform.keytab) {
    *end = new KeytabEntry(entry);
    (*end)->next = nullptr;
    end = &(*end)->next;
  }
  if (*list != nullptr) platform.Born("KeytabEntry");
  return fails ? -1 : platform.done;
}

void VORNNFSKeytabInfoFree(KeytabEntry* list) {
  FakePlatform::Current().Record("VORNNFSKeytabInfoFree");
  if (list != nullptr) FakePlatform::Current().Died("KeytabEntry");
  while (list != nullptr) {
    KeytabEntry* const next = list->next;
    delete list;
    list = next;
  }
}

int VORNNFSRuleExtGet(const char* file, const char* path, ExportRuleList** list) {
  FakePlatform& platform = FakePlatform::Current();
  const bool fails = platform.Fails("VORNNFSRuleExtGet", std::string(file) + " " + path);
  if (!platform.rules.empty() || platform.rules_listed_empty) *list = CopyRules(path, platform.rules);
  if (fails) return -1;
  if (platform.rules_found >= 0) return platform.rules_found;
  return *list == nullptr ? 0 : 1;
}

int VORNNFSRuleExtSetAll(const char* path, const ExportRuleList* list) {
  FakePlatform& platform = FakePlatform::Current();
  const std::string arguments = std::string(path) + (list == nullptr ? " (null)" : "");
  if (platform.Fails("VORNNFSRuleExtSetAll", arguments)) return -1;
  platform.rules.clear();
  for (const ExportRule* rule = list == nullptr ? nullptr : list->first; rule != nullptr; rule = rule->next) {
    platform.rules.push_back(*rule);
  }
  return platform.done;
}

void VORNNFSRuleExtFree(ExportRuleList* list) {
  FakePlatform::Current().Record("VORNNFSRuleExtFree");
  if (list == nullptr) return;
  ExportRule* rule = list->first;
  while (rule != nullptr) {
    ExportRule* const next = rule->next;
    free(rule);
    rule = next;
  }
  free(list);
  // A list that the module allocated is not counted here; the address sanitizer detects its leak.
  auto& live = FakePlatform::Current().live_objects;
  if (live.count("ExportRuleList") != 0) FakePlatform::Current().Died("ExportRuleList");
}

int VORNShareGet(const char* name, VORNSHARE** share) {
  FakePlatform& platform = FakePlatform::Current();
  if (platform.Fails("VORNShareGet", name)) return -1;
  const auto found = platform.shares.find(name);
  if (found == platform.shares.end()) return -1;
  *share = new VORNSHARE{found->second};
  platform.Born("VORNSHARE");
  return platform.done;
}

void VORNShareFree(VORNSHARE* share) {
  FakePlatform::Current().Record("VORNShareFree");
  if (share == nullptr) return;
  delete share;
  FakePlatform::Current().Died("VORNSHARE");
}

int VORNShareEnum(KLIBSZHASH** hash) {
  FakePlatform& platform = FakePlatform::Current();
  if (platform.Fails("VORNShareEnum")) return -1;
  for (const auto& [name, path] : platform.shares) KLIBCSzHashSetValue(hash, name.c_str(), path.c_str());
  return platform.done;
}

int VORNShareCreate(const char* name, const char* path) {
  FakePlatform& platform = FakePlatform::Current();
  if (platform.Fails("VORNShareCreate", std::string(name) + " " + path))
    return platform.FailureResult("VORNShareCreate");
  platform.shares[name] = path;
  return platform.done;
}

int VORNShareDelete(const char* name) {
  FakePlatform& platform = FakePlatform::Current();
  if (platform.Fails("VORNShareDelete", name)) return platform.FailureResult("VORNShareDelete");
  platform.shares.erase(name);
  return platform.done;
}

const char* KLIBSharePathGet(const VORNSHARE* share) {
  FakePlatform::Current().Record("KLIBSharePathGet");
  return share->path.c_str();
}

int VORNFSHasMountPointType(const char* path, int type) {
  FakePlatform& platform = FakePlatform::Current();
  const std::string arguments = std::string(path) + " " + std::to_string(type);
  return platform.Fails("VORNFSHasMountPointType", arguments) ? -1 : platform.mount_point_result;
}

int VORNFwRuleHup(void) { return Answered("VORNFwRuleHup", ""); }
}
