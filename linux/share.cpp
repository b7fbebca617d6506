// Shared folders: /etc/vorn/shares.conf, one "name = path" per share in its section [shares].
#include "share.h"

#include <cerrno>
#include <string>

#include "core.h"
#include "error.h"
#include "ini_file.h"
#include "root.h"

struct VORNSHARE {
  std::string path;
};

namespace vorn {
namespace {

constexpr char kFile[] = "/etc/vorn/shares.conf";
constexpr char kSection[] = "shares";

// Without links and dots: where exportfs(8) will look for it. A path can lead out of the root only
// as it could on the box, that is nowhere.
Result<std::string> CanonicalPath(const IniFile& file, const IniEntry& share) {
  if (share.value.front() != '/') return file.Refuse(kSection, share.key, "is not an absolute path");
  const Root root = Root::Current();
  const Result<std::string> located = root.Locate(share.value);
  if (!located.ok()) return located.status();
  return root.OnBox(*located);
}

Result<std::string> FindShare(const std::string& name) {
  const Result<IniFile> file = IniFile::Open(kFile);
  if (!file.ok()) return file.status();
  for (const IniEntry& share : file->document().Entries(kSection)) {
    if (share.key == name) return CanonicalPath(*file, share);
  }
  return Status::Failure(ENOENT, "there is no shared folder \"" + name + "\"");
}

}  // namespace
}  // namespace vorn

extern "C" {

int VORNShareGet(const char* name, VORNSHARE** share) {
  vorn::Result<std::string> path = vorn::FindShare(name);
  if (!path.ok()) return vorn::ToResult(path.status());
  *share = new VORNSHARE{std::move(*path)};
  return 0;
}

void VORNShareFree(VORNSHARE* share) { delete share; }

const char* KLIBSharePathGet(const VORNSHARE* share) { return share->path.c_str(); }

}  // extern "C"
