#include "writes.h"

#include <cstring>
#include <filesystem>
#include <memory>

#include "keytab_maker.h"
#include "nfsconf.h"

namespace {

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

int SaveMapping() {
  const std::unique_ptr<_tag_nfs_id_map_, FreeMap> map(VORNNFSIDMapGet());
  if (map == nullptr || KLIBCSzHashSetValue(&map->table, "carol@LAB.TEST", "carol") < 0) return -1;
  return VORNNFSIDMapSet("/etc/idmapd.conf", map.get());
}

int SaveSettings() {
  NFSConfRecord record{};
  if (VORNNFSConfGet(&record) < 0) return -1;
  record.read_size = 65536;
  record.custom_port_enable = 1;
  record.statd_port = 4000;
  return VORNNFSConfSet(&record);
}

}  // namespace

std::vector<Change> AllChanges(const TemporaryRoot& root) {
  const std::string upload = root.At("/upload");
  return {{"a save of export rules", SaveRules, {"/etc/exports"}},
          {"a change of the ID map", SaveMapping, {"/etc/idmapd.conf"}},
          {"an import of a keytab",
           [upload] { return VORNNFSKeytabImport(upload.c_str()); },
           {"/etc/nfs/krb5.keytab", "/etc/nfs.conf.d/vorn.conf"}},
          {"a change of the settings", SaveSettings, {"/etc/nfs.conf.d/vorn.conf"}}};
}

void FurnishFiles(const TemporaryRoot& root) {
  root.Write("/etc/exports", "# ours\n/volume1/media *(ro)\n/volume1/data 10.9.9.9(rw)\n");
  root.Write("/etc/idmapd.conf", "# ours\n[General]\nDomain = lab.test\n[Static]\nalice@LAB.TEST = alice\n");
  root.Write("/etc/nfs.conf.d/vorn.conf", "# ours\n[nfsd]\nvers4 = y\n");
  root.Write("/etc/nfs/krb5.keytab", EncodeFile({EncodeEntry("old", "LAB.TEST", 17)}));
  root.Write("/etc/passwd", "root:x:0:0::/:/bin/sh\nadmin:x:1024:100::/:/bin/sh\nnobody:x:65534:65534::/:/bin/sh\n");
  root.Write("/upload", EncodeFile({EncodeEntry("new", "LAB.TEST", 17)}));
}

Contents ContentsOf(const TemporaryRoot& root, const Change& change) {
  Contents contents;
  for (const char* file : change.files) {
    if (auto text = root.Read(file)) contents[file] = *text;
  }
  return contents;
}

std::vector<std::string> Leftovers(const TemporaryRoot& root, const Change& change) {
  std::vector<std::string> leftovers;
  for (const char* file : change.files) {
    for (const std::string& name : root.Names(std::filesystem::path(file).parent_path().string())) {
      if (name.find(".vorn-") != std::string::npos) leftovers.push_back(name);
    }
  }
  return leftovers;
}
