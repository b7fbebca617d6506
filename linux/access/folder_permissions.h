// The UNIX permissions of a folder.
#ifndef VORN_LINUX_ACCESS_FOLDER_PERMISSIONS_H
#define VORN_LINUX_ACCESS_FOLDER_PERMISSIONS_H

#include <cstdint>
#include <string>
#include <vector>

#include "access.h"
#include "box.h"
#include "status.h"

namespace vorn {

struct FolderPermissions {
  std::uint32_t owner = 0;
  std::uint32_t group = 0;
  unsigned mode = 0;  // the last nine bits
  std::string acl;    // the value of system.posix_acl_access (acl(5)); empty if there is none

  // The bits of `wanted` (4: list, 2: change, 1: enter) that the user has. Root has all of them.
  unsigned Of(const VORN::AccessIdentity& identity, unsigned wanted) const;
};

// Fails with the system's error if the folder cannot be looked at.
Result<FolderPermissions> ReadFolderPermissions(Box& box, const std::string& path);

}  // namespace vorn

#endif  // VORN_LINUX_ACCESS_FOLDER_PERMISSIONS_H
