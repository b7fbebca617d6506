#include "writes.h"

#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <memory>

#include "keytab_maker.h"
#include "nfsconf.h"
#include "webapi.h"

namespace {

constexpr char kExports[] = "/etc/exports";
constexpr char kIDMap[] = "/etc/idmapd.conf";
constexpr char kKeytab[] = "/etc/nfs/krb5.keytab";
constexpr char kSettings[] = "/etc/nfs.conf.d/vorn.conf";
constexpr char kDropIn[] = "/etc/systemd/system/nfs-server.service.d/vorn.conf";
constexpr char kState[] = "/var/lib/vorn/nfsd.state";

struct FreeMap {
  void operator()(_tag_nfs_id_map_* map) const { VORNNFSIDMapFree(map); }
};

int SaveRules() {
  ExportRule rule{};
  std::strcpy(rule.client, "10.0.0.0/24");
  rule.privilege = 1;
  rule.sys = 1;
  ExportRuleList list{};
  std::strcpy(list.path, "/volume1/data");
  list.first = &rule;
  return VORNNFSRuleExtSetAll("/volume1/data", &list);
}

int RemoveRules() { return VORNNFSRuleExtSetAll("/volume1/data", nullptr); }

// Reads, edits and writes the record, as every request about the ID map does.
int EditMap(const std::function<void(_tag_nfs_id_map_*)>& edit) {
  const std::unique_ptr<_tag_nfs_id_map_, FreeMap> map(VORNNFSIDMapGet());
  if (map == nullptr) return -1;
  edit(map.get());
  return VORNNFSIDMapSet(kIDMap, map.get());
}

int AddMapping() {
  return EditMap([](_tag_nfs_id_map_* map) { KLIBCSzHashSetValue(&map->table, "carol@LAB.TEST", "carol"); });
}

int ChangeMapping() {
  return EditMap([](_tag_nfs_id_map_* map) { KLIBCSzHashSetValue(&map->table, "alice@LAB.TEST", "bob"); });
}

int RemoveMapping() {
  return EditMap([](_tag_nfs_id_map_* map) { KLIBCSzHashRemoveKey(map->table, "alice@LAB.TEST"); });
}

int ChangeDomain() {
  return EditMap([](_tag_nfs_id_map_* map) {
    std::free(map->domain);
    map->domain = strdup("new.test");
  });
}

int SaveSettings() {
  const VornConf configuration;
  NFSConfRecord record{};
  if (VORNNFSConfGet(&record) < 0) return -1;
  record.read_size = 65536;
  record.custom_port_enable = 1;
  record.statd_port = 4000;
  return VORNNFSConfSet(&record);
}

// Changes a port as a request does: the check of the port reads the files once more.
int SavePort() {
  const VornConf configuration;
  NFSConfRecord record{};
  if (VORNNFSConfGet(&record) < 0 || WebUtils::IsPortConflict("nfs_statd", 4000, 4000) != 0) return -1;
  record.custom_port_enable = 1;
  record.statd_port = 4000;
  return VORNNFSConfSet(&record);
}

int AnnounceSizes() { return VORNNFSUDPPrefSizeSet(65536, 65536); }

int StartService() { return KLIBServiceStart("nfsd", 0); }

}  // namespace

std::vector<Change> AllChanges(const TemporaryRoot& root) {
  const std::string upload = root.At("/upload");
  return {{"a save of export rules", SaveRules, {kExports}},
          {"a removal of export rules", RemoveRules, {kExports}},
          {"a new mapping", AddMapping, {kIDMap}},
          {"a change of a mapping", ChangeMapping, {kIDMap}},
          {"a removal of a mapping", RemoveMapping, {kIDMap}},
          {"a change of the domain", ChangeDomain, {kIDMap}},
          {"an import of a keytab", [upload] { return VORNNFSKeytabImport(upload.c_str()); }, {kKeytab, kSettings}},
          {"a change of the settings", SaveSettings, {kSettings}},
          {"a change of a port", SavePort, {kSettings}},
          {"a change of the transfer sizes", AnnounceSizes, {kDropIn}},
          {"a start of the service", StartService, {kState, kDropIn}}};
}

void WriteAllFiles(const TemporaryRoot& root) {
  root.Write(kExports, "# ours\n/volume1/media *(ro)\n/volume1/data 10.9.9.9(rw)\n");
  root.Write(kIDMap, "# ours\n[General]\nDomain = lab.test\n[Static]\nalice@LAB.TEST = alice\n");
  root.Write(kSettings, "# ours\n[nfsd]\nvers4 = y\n");
  root.Write(kKeytab, EncodeFile({EncodeEntry("old", "LAB.TEST", 17)}));
  root.Write(kDropIn, "# of an older version\n");
  root.Write(kState, "disabled\n");
  WriteForeignFiles(root);
}

void WriteForeignFiles(const TemporaryRoot& root) {
  root.Write("/etc/passwd", "root:x:0:0::/:/bin/sh\nadmin:x:1024:100::/:/bin/sh\nnobody:x:65534:65534::/:/bin/sh\n");
  root.Write("/upload", EncodeFile({EncodeEntry("new", "LAB.TEST", 17)}));
}

Contents ContentsOf(const TemporaryRoot& root, const Change& change) {
  Contents contents;
  for (const char* file : change.files) contents[file] = root.Read(file);
  return contents;
}

std::vector<std::string> Leftovers(const TemporaryRoot& root, const Change& change) {
  std::vector<std::string> leftovers;
  for (const char* file : change.files) {
    const std::string folder = std::filesystem::path(file).parent_path();
    if (!std::filesystem::is_directory(root.At(folder))) continue;
    for (const std::string& name : root.Names(folder)) {
      if (name.find(".vorn-") != std::string::npos) leftovers.push_back(name);
    }
  }
  return leftovers;
}
