#include "path_resolver.h"

namespace vorn {

std::string PathResolver::Resolve(const std::string& path) {
  const std::size_t slash = path.rfind('/');
  if (slash == std::string::npos || slash + 1 == path.size()) return paths_.Resolve(path);
  const std::string parent = slash == 0 ? "/" : path.substr(0, slash);
  auto known = folders_.find(parent);
  if (known == folders_.end()) known = folders_.emplace(parent, paths_.FolderAt(parent)).first;
  const ExportPaths::Folder& folder = known->second;
  const std::string name = path.substr(slash + 1);
  if (name == ".." || (folder.links != nullptr && folder.links->count(name) != 0)) return paths_.Resolve(path);
  return (folder.path == "/" ? "" : folder.path) + "/" + name;
}

}  // namespace vorn
