// Shared folders: /etc/vorn/shares.conf, one "name = path" per share in its section [shares].
#ifndef VORN_LINUX_HOST_SHARES_H
#define VORN_LINUX_HOST_SHARES_H

#include <string>
#include <vector>

#include "box.h"
#include "status.h"

namespace vorn {

inline constexpr char kSharesFile[] = "/etc/vorn/shares.conf";

// The path of the share with this exact name: absolute, without links and dots, as exportfs(8) resolves it.
// Fails with ENOENT if there is no such share.
Result<std::string> FindSharePath(Box& box, const std::string& name);

// Returns the paths of all shares as the file has them. Fails with ENOENT if there is no such file.
Result<std::vector<std::string>> ListSharePaths(Box& box);

struct SharedFolder {
  std::string name;
  std::string path;  // as FindSharePath returns it, or as the file has it where it has none
};

// Returns all shares in the order of the file; none if there is no such file.
Result<std::vector<SharedFolder>> ListShares(Box& box);

// Adds a share. `path` is that of an existing folder; the file gets it without links and dots. Fails with EEXIST if a
// share has this name, or one that differs from it in the case of ASCII letters only, or this path; with ENOENT or
// ENOTDIR if there is no folder at the path; with kRefusedText for a name or a path that the file cannot represent.
Status AddShare(Box& box, const std::string& name, const std::string& path);

// Removes a share. Fails with ENOENT if there is no share with this exact name.
Status RemoveShare(Box& box, const std::string& name);

}  // namespace vorn

#endif  // VORN_LINUX_HOST_SHARES_H
