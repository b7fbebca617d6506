#include "share.h"

#include <cerrno>
#include <string>
#include <utility>
#include <vector>

#include "core.h"
#include "current_box.h"
#include "error.h"
#include "nfsconf.h"
#include "shared_folders.h"
#include "shares.h"

struct VORNSHARE {
  std::string path;
};

namespace {

// Callers copy the path into ExportRuleList::path. A path that is cut there would be the path of another folder,
// whose export rules the caller would then replace.
vorn::Status CheckLength(const std::string& path) {
  if (path.size() < sizeof ExportRuleList::path) return {};
  return vorn::Status::System(ENAMETOOLONG, "shared folder " + path);
}

vorn::Status AddShare(const char* name, const char* path) {
  if (name == nullptr || path == nullptr) return vorn::Status::Failure(EINVAL, "no name, or no path");
  vorn::Status status = CheckLength(path);
  if (!status.ok()) return status;
  return vorn::AddShare(vorn::CurrentBox(), name, path);
}

vorn::Status EnumerateShares(KLIBSZHASH** hash) {
  if (hash == nullptr || *hash == nullptr) return vorn::Status::Failure(EINVAL, "no hash");
  const vorn::Result<std::vector<vorn::SharedFolder>> shares = vorn::ListShares(vorn::CurrentBox());
  if (!shares.ok()) return shares.status();
  for (const vorn::SharedFolder& share : *shares) {
    if (KLIBCSzHashGetValue(*hash, share.name.c_str()) != nullptr) continue;  // the first entry counts
    if (KLIBCSzHashSetValue(hash, share.name.c_str(), share.path.c_str()) < 0) {
      return vorn::Status::System(ENOMEM, "shared folders");
    }
  }
  return {};
}

}  // namespace

int VORNShareEnum(KLIBSZHASH** hash) { return vorn::ToResult(EnumerateShares(hash)); }

int VORNShareCreate(const char* name, const char* path) {
  const vorn::Status status = AddShare(name, path);
  if (vorn::ToResult(status) == 0) return 0;
  if (status.code() == EEXIST) return VORNSHARE_EXISTS;
  return status.code() == ENOENT || status.code() == ENOTDIR ? VORNSHARE_NO_FOLDER : VORNSHARE_FAILED;
}

int VORNShareDelete(const char* name) {
  const vorn::Status status =
      name == nullptr ? vorn::Status::Failure(EINVAL, "no name") : vorn::RemoveShare(vorn::CurrentBox(), name);
  if (vorn::ToResult(status) == 0) return 0;
  return status.code() == ENOENT ? VORNSHARE_NO_SHARE : VORNSHARE_FAILED;
}

int VORNShareGet(const char* name, VORNSHARE** share) {
  if (name == nullptr || share == nullptr) return vorn::ToResult(vorn::Status::Failure(EINVAL, "no name, or no share"));
  vorn::Result<std::string> path = vorn::FindSharePath(vorn::CurrentBox(), name);
  if (!path.ok()) return vorn::ToResult(path.status());
  if (const vorn::Status status = CheckLength(*path); !status.ok()) return vorn::ToResult(status);
  *share = new VORNSHARE{std::move(*path)};
  return 0;
}

void VORNShareFree(VORNSHARE* share) { delete share; }

const char* KLIBSharePathGet(const VORNSHARE* share) { return share->path.c_str(); }
