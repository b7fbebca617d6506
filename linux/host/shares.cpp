#include "shares.h"

#include <cerrno>
#include <utility>

#include "ini_file.h"

namespace vorn {
namespace {

constexpr char kFile[] = "/etc/vorn/shares.conf";
constexpr char kSection[] = "shares";

Result<std::string> CanonicalPath(const Root& root, const IniFile& file, const IniEntry& share) {
  if (share.value.front() != '/') return file.Refuse(kSection, share.key, "is not an absolute path");
  const Result<std::string> located = root.Locate(share.value);
  if (!located.ok()) return located.status();
  return root.OnBox(*located);
}

}  // namespace

Result<std::string> FindSharePath(Box& box, const std::string& name) {
  const Result<SharedIniFile> file = IniFile::Open(box, kFile);
  if (!file.ok()) return file.status();
  for (const IniEntry& share : (*file)->document().Entries(kSection)) {
    if (share.key == name) return CanonicalPath(box.root(), **file, share);
  }
  return Status::Failure(ENOENT, "there is no shared folder \"" + name + "\"");
}

Result<std::vector<std::string>> ListSharePaths(Box& box) {
  const Result<SharedIniFile> file = IniFile::Open(box, kFile);
  if (!file.ok()) return file.status();
  if (!(*file)->exists()) return Status::System(ENOENT, (*file)->location());
  std::vector<std::string> paths;
  for (IniEntry& share : (*file)->document().Entries(kSection)) paths.push_back(std::move(share.value));
  return paths;
}

}  // namespace vorn
