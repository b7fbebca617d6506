// Resolves the paths of many lines.
#ifndef VORN_LINUX_EXPORTS_PATH_RESOLVER_H
#define VORN_LINUX_EXPORTS_PATH_RESOLVER_H

#include <string>
#include <unordered_map>

#include "export_paths.h"

namespace vorn {

// Looks each folder up once; most exported directories are in few folders. Refers to `paths`.
class PathResolver {
 public:
  explicit PathResolver(const ExportPaths& paths) : paths_(paths) {}

  // Returns what ExportPaths::Resolve returns. `path` is absolute and in normal form.
  std::string Resolve(const std::string& path);

 private:
  const ExportPaths& paths_;
  std::unordered_map<std::string, ExportPaths::Folder> folders_;
};

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_PATH_RESOLVER_H
