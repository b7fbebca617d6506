#include "share.h"

#include <cerrno>
#include <string>
#include <utility>

#include "core.h"
#include "current_box.h"
#include "error.h"
#include "nfsconf.h"
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

}  // namespace

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
