#include "shares.h"

#include <sys/stat.h>

#include <cerrno>
#include <utility>

#include "ascii.h"
#include "configuration_lock.h"
#include "ini_file.h"

namespace vorn {
namespace {

constexpr char kSection[] = "shares";
constexpr char kHeading[] = "# The shared folders of this box: a line \"name = path\" for each.\n";
constexpr std::size_t kLongestName = 255;

Result<std::string> CanonicalPath(const Root& root, const IniFile& file, const IniEntry& share) {
  if (share.value.front() != '/') return file.Refuse(kSection, share.key, "is not an absolute path");
  const Result<std::string> located = root.Locate(share.value);
  if (!located.ok()) return located.status();
  return root.OnBox(*located);
}

Result<IniKey> CheckName(const std::string& name) {
  const std::optional<IniKey> key = IniKey::From(name);
  const bool is_file_name = name.find('/') == std::string::npos && name.front() != '.';
  if (key && is_file_name && name.size() <= kLongestName) return *key;
  return Status::Failure(kRefusedText, "\"" + name + "\" cannot be the name of a shared folder: it is longer than " +
                                           std::to_string(kLongestName) +
                                           " bytes, begins with a dot, or has a character such as / = [ # or a blank "
                                           "at its end");
}

// Returns the path of an existing folder, without links and dots.
Result<std::string> CheckFolder(const Root& root, const std::string& path) {
  const Result<std::string> located = root.Locate(path);
  if (!located.ok()) return located.status();
  struct stat folder {};
  if (stat(located->c_str(), &folder) != 0) return Status::System(errno, path);
  if (!S_ISDIR(folder.st_mode)) return Status::System(ENOTDIR, path);
  std::string canonical = root.OnBox(*located);
  if (canonical == "/") return Status::Failure(kRefusedText, "the root folder cannot be shared");
  return canonical;
}

// A second entry for a folder would show the same export rules under two names.
Status CheckIsNew(Box& box, const std::string& name, const std::string& path) {
  const Result<std::vector<SharedFolder>> shares = ListShares(box);
  if (!shares.ok()) return shares.status();
  for (const SharedFolder& share : *shares) {
    const bool has_name = LowerAscii(share.name) == LowerAscii(name);
    if (!has_name && share.path != path) continue;
    return Status::Failure(EEXIST, "there is a shared folder \"" + share.name + "\" with the path " + share.path);
  }
  return {};
}

}  // namespace

Result<std::string> FindSharePath(Box& box, const std::string& name) {
  const Result<SharedIniFile> file = IniFile::Open(box, kSharesFile);
  if (!file.ok()) return file.status();
  for (const IniEntry& share : (*file)->document().Entries(kSection)) {
    if (share.key == name) return CanonicalPath(box.root(), **file, share);
  }
  return Status::Failure(ENOENT, "there is no shared folder \"" + name + "\"");
}

Result<std::vector<std::string>> ListSharePaths(Box& box) {
  const Result<SharedIniFile> file = IniFile::Open(box, kSharesFile);
  if (!file.ok()) return file.status();
  if (!(*file)->exists()) return Status::System(ENOENT, (*file)->location());
  std::vector<std::string> paths;
  for (IniEntry& share : (*file)->document().Entries(kSection)) paths.push_back(std::move(share.value));
  return paths;
}

Result<std::vector<SharedFolder>> ListShares(Box& box) {
  const Result<SharedIniFile> file = IniFile::Open(box, kSharesFile);
  if (!file.ok()) return file.status();
  std::vector<SharedFolder> shares;
  for (const IniEntry& share : (*file)->document().Entries(kSection)) {
    const Result<std::string> path = CanonicalPath(box.root(), **file, share);
    shares.push_back({share.key, path.ok() ? *path : share.value});
  }
  return shares;
}

Status AddShare(Box& box, const std::string& name, const std::string& path) {
  const Result<IniKey> key = CheckName(name);
  if (!key.ok()) return key.status();
  const ConfigurationLock lock(box);
  if (!lock.status().ok()) return lock.status();
  const Result<std::string> folder = CheckFolder(box.root(), path);
  if (!folder.ok()) return folder.status();
  const std::optional<IniValue> value = IniValue::From(*folder);
  if (!value) return Status::Failure(kRefusedText, "shares.conf cannot represent the path " + *folder);
  if (Status status = CheckIsNew(box, name, *folder); !status.ok()) return status;
  Result<IniEditor> file = IniEditor::Open(box, kSharesFile, kHeading);
  if (!file.ok()) return file.status();
  file->document().Set(*IniSection::From(kSection), *key, *value);
  return file->Save();
}

Status RemoveShare(Box& box, const std::string& name) {
  const ConfigurationLock lock(box);
  if (!lock.status().ok()) return lock.status();
  Result<IniEditor> file = IniEditor::Open(box, kSharesFile);
  if (!file.ok()) return file.status();
  for (const IniEntry& share : file->document().Entries(kSection)) {
    if (share.key != name) continue;
    file->document().Remove(kSection, name);
    return file->Save();
  }
  return Status::Failure(ENOENT, "there is no shared folder \"" + name + "\"");
}

}  // namespace vorn
