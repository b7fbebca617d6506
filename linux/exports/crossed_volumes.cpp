#include "crossed_volumes.h"

#include <set>

#include "box_paths.h"
#include "exports_client.h"
#include "mount_table.h"

namespace vorn {
namespace {

std::set<std::string> ClientsOf(const std::vector<SharedExportsFile>& files, const std::string& path,
                                const ExportPaths& paths) {
  std::set<std::string> clients;
  for (const SharedExportsFile& file : files) {
    for (const ExportEntry& entry : file->document.Entries(path, paths)) clients.insert(ExportClientKey(entry.client));
  }
  return clients;
}

}  // namespace

std::vector<std::string> DescribeCrossedVolumes(Box& box, const std::vector<SharedExportsFile>& files,
                                                const std::string& path, const std::vector<ExportEntry>& entries) {
  std::vector<std::string> crossing;
  for (const ExportEntry& entry : entries) {
    if (entry.options.crossmnt) crossing.push_back(entry.client);
  }
  if (crossing.empty()) return {};
  const Result<MountTable> mounts = MountTable::Read(box);
  if (!mounts.ok()) return {};
  const BoxPaths paths(box.root());
  std::vector<std::string> sentences;
  for (const std::string& volume : mounts->FoldersBelow(path)) {
    const std::set<std::string> clients = ClientsOf(files, volume, paths);
    std::string opened;
    for (const std::string& client : crossing) {
      if (clients.count(ExportClientKey(client)) == 0) opened.append(opened.empty() ? "" : ", ").append(client);
    }
    if (clients.empty() || opened.empty()) continue;
    std::string sentence = "the option crossmnt of ";
    sentence.append(path).append(" also opens ").append(volume).append(" to ").append(opened);
    sentences.push_back(sentence.append(", which the rules of ").append(volume).append(" do not name"));
  }
  return sentences;
}

}  // namespace vorn
