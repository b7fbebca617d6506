// Shared folders: /etc/vorn/shares.conf, one "name = path" per share in its section [shares].
#ifndef VORN_LINUX_HOST_SHARES_H
#define VORN_LINUX_HOST_SHARES_H

#include <string>
#include <vector>

#include "box.h"
#include "status.h"

namespace vorn {

// The path of the share with this exact name: absolute, without links and dots, as exportfs(8) resolves it.
// Fails with ENOENT if there is no such share.
Result<std::string> FindSharePath(Box& box, const std::string& name);

// Returns the paths of all shares as the file has them. Fails with ENOENT if there is no such file.
Result<std::vector<std::string>> ListSharePaths(Box& box);

}  // namespace vorn

#endif  // VORN_LINUX_HOST_SHARES_H
