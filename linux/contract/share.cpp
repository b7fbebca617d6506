#include "share.h"

#include <cerrno>
#include <string>
#include <utility>

#include "core.h"
#include "current_box.h"
#include "error.h"
#include "shares.h"

struct VORNSHARE {
  std::string path;
};

int VORNShareGet(const char* name, VORNSHARE** share) {
  if (name == nullptr || share == nullptr) return vorn::ToResult(vorn::Status::Failure(EINVAL, "no name, or no share"));
  vorn::Result<std::string> path = vorn::FindSharePath(vorn::CurrentBox(), name);
  if (!path.ok()) return vorn::ToResult(path.status());
  *share = new VORNSHARE{std::move(*path)};
  return 0;
}

void VORNShareFree(VORNSHARE* share) { delete share; }

const char* KLIBSharePathGet(const VORNSHARE* share) { return share->path.c_str(); }
