#include "box_paths.h"

#include <dirent.h>
#include <sys/stat.h>

#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <string_view>
#include <unordered_map>

#include "files.h"
#include "owned.h"

namespace vorn {
namespace {

using Names = ExportPaths::Names;

// More folders than a box has shares in; a limit for the memory of a process that sees many roots.
constexpr std::size_t kMostFolders = 4096;

bool IsLink(const std::string& folder, const dirent& entry) {
  if (entry.d_type != DT_UNKNOWN) return entry.d_type == DT_LNK;
  struct stat stat {};
  return lstat((folder + "/" + entry.d_name).c_str(), &stat) == 0 && S_ISLNK(stat.st_mode);
}

// Returns nullptr if the folder has no links, or cannot be read: exportfs(8) cannot follow them then, either.
std::shared_ptr<const Names> ReadLinks(const std::string& location) {
  const Owned<DIR, closedir> folder(opendir(location.c_str()));
  if (folder == nullptr) return nullptr;
  Names links;
  while (const dirent* entry = readdir(folder.get())) {
    if (IsLink(location, *entry)) links.insert(entry->d_name);
  }
  return links.empty() ? nullptr : std::make_shared<const Names>(std::move(links));
}

// The links of folders, by their location on this system.
class LinkCache {
 public:
  std::shared_ptr<const Names> LinksIn(const std::string& location) {
    const std::int64_t now = FileClock();
    const Result<FileStamp> stamp = StampOfFile(location);
    if (!stamp.ok() || !stamp->exists) return nullptr;
    if (const auto known = Find(location, *stamp)) return known->links;
    auto links = ReadLinks(location);
    if (IsSettled(*stamp, now)) Keep(location, {*stamp, links});
    return links;
  }

 private:
  struct Known {
    FileStamp stamp;
    std::shared_ptr<const Names> links;
  };

  std::optional<Known> Find(const std::string& location, const FileStamp& stamp) {
    const std::lock_guard lock(mutex_);
    const auto found = folders_.find(location);
    if (found == folders_.end() || !IsSameFile(found->second.stamp, stamp)) return std::nullopt;
    return found->second;
  }

  void Keep(const std::string& location, Known known) {
    const std::lock_guard lock(mutex_);
    if (folders_.size() >= kMostFolders) folders_.clear();
    folders_[location] = std::move(known);
  }

  std::mutex mutex_;
  std::unordered_map<std::string, Known> folders_;
};

// Never destroyed: other threads may still run calls while the process exits.
LinkCache& Links() {
  static auto* cache = new LinkCache;
  return *cache;
}

}  // namespace

std::string BoxPaths::Resolve(const std::string& path) const {
  const Result<std::string> located = root_.Locate(path.substr(0, 1) == "/" ? path : "/" + path);
  return located.ok() ? root_.OnBox(*located) : NormalExportPath(path);
}

ExportPaths::Folder BoxPaths::FolderAt(const std::string& path) const {
  const Result<std::string> located = root_.Locate(path);
  if (!located.ok()) return {path, nullptr};
  return {root_.OnBox(*located), Links().LinksIn(*located)};
}

}  // namespace vorn
