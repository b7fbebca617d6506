// The directories that the paths of an exports(5) file name.
#ifndef VORN_LINUX_EXPORTS_EXPORT_PATHS_H
#define VORN_LINUX_EXPORTS_EXPORT_PATHS_H

#include <memory>
#include <set>
#include <string>

#include "exports_text.h"

namespace vorn {

// exportfs(8) follows symbolic links, so two different paths may be one directory to it. This class only knows
// the text of a path; BoxPaths (box_paths.h) knows the links of a box. Not for several threads at once.
class ExportPaths {
 public:
  using Names = std::set<std::string, std::less<>>;

  // A folder in which exported directories are.
  struct Folder {
    std::string path;                    // without links
    std::shared_ptr<const Names> links;  // the names in it that are symbolic links; null if there is none
  };

  ExportPaths() = default;
  virtual ~ExportPaths() = default;
  ExportPaths(const ExportPaths&) = delete;
  ExportPaths& operator=(const ExportPaths&) = delete;

  // Returns the path without links of the directory that `path` leads to.
  virtual std::string Resolve(const std::string& path) const { return NormalExportPath(path); }

  // Returns the folder at `path`, which is absolute and in normal form.
  virtual Folder FolderAt(const std::string& path) const { return {path, nullptr}; }
};

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORT_PATHS_H
