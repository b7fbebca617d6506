#include "crossed_volumes.h"

#include <algorithm>
#include <set>
#include <utility>

#include "box_paths.h"
#include "exports_client.h"
#include "folder_path.h"
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

std::vector<CrossedVolume> FindCrossedVolumes(const std::vector<std::string>& mounts,
                                              const std::vector<SharedExportsFile>& files, const std::string& path,
                                              const std::vector<ExportEntry>& entries, const ExportPaths& paths) {
  std::vector<std::string> crossing;
  for (const ExportEntry& entry : entries) {
    if (entry.options.crossmnt) crossing.push_back(entry.client);
  }
  std::vector<CrossedVolume> crossed;
  if (crossing.empty()) return crossed;
  // The folders below `path` follow each other behind "PATH/".
  for (auto volume = std::lower_bound(mounts.begin(), mounts.end(), path == "/" ? path : path + "/");
       volume != mounts.end() && IsBelow(*volume, path); ++volume) {
    const std::set<std::string> clients = ClientsOf(files, *volume, paths);
    std::vector<std::string> opened;
    for (const std::string& client : crossing) {
      if (clients.count(ExportClientKey(client)) == 0) opened.push_back(client);
    }
    if (!clients.empty() && !opened.empty()) crossed.push_back({*volume, std::move(opened)});
  }
  return crossed;
}

std::vector<std::string> DescribeCrossedVolumes(Box& box, const std::vector<SharedExportsFile>& files,
                                                const std::string& path, const std::vector<ExportEntry>& entries) {
  const bool crosses =
      std::any_of(entries.begin(), entries.end(), [](const ExportEntry& entry) { return entry.options.crossmnt; });
  if (!crosses) return {};  // the table of mounts is not needed
  const Result<MountTable> mounts = MountTable::Read(box);
  if (!mounts.ok()) return {};
  std::vector<std::string> sentences;
  for (const CrossedVolume& crossed :
       FindCrossedVolumes(mounts->FoldersBelow(path), files, path, entries, BoxPaths(box.root()))) {
    std::string opened;
    for (const std::string& client : crossed.clients) opened.append(opened.empty() ? "" : ", ").append(client);
    std::string sentence = "the option crossmnt of ";
    sentence.append(path).append(" also opens ").append(crossed.volume).append(" to ").append(opened);
    sentences.push_back(sentence.append(", which the rules of ").append(crossed.volume).append(" do not name"));
  }
  return sentences;
}

}  // namespace vorn
