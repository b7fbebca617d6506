// The symbolic links among the exported directories of a box.
#ifndef VORN_LINUX_EXPORTS_BOX_PATHS_H
#define VORN_LINUX_EXPORTS_BOX_PATHS_H

#include <string>
#include <utility>

#include "export_paths.h"
#include "root.h"

namespace vorn {

// Follows links as exportfs(8) does on the box: a path that does not begin with "/" begins in "/", the working
// directory of the service. Of a path that does not exist the existing part is resolved.
//
// FolderAt remembers the links of a folder for as long as its stat(2) data stays the same, for all objects of the
// process, so that a repeated look at 10,000 shares of one folder costs a few system calls.
class BoxPaths : public ExportPaths {
 public:
  explicit BoxPaths(Root root) : root_(std::move(root)) {}

  std::string Resolve(const std::string& path) const override;
  Folder FolderAt(const std::string& path) const override;

 private:
  const Root root_;
};

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_BOX_PATHS_H
