#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "core.h"
#include "error.h"
#include "ini_file.h"
#include "krb5_profile.h"
#include "root.h"

namespace vorn {
namespace {

bool EndsWith(std::string_view text, std::string_view end) {
  return text.size() >= end.size() && text.substr(text.size() - end.size()) == end;
}

Result<std::optional<std::string>> FindValue(const std::string& path, const char* section, const char* key) {
  if (EndsWith(path, "krb5.conf")) {
    const Result<std::string> place = Root::Current().Locate(path);
    if (!place.ok()) return place.status();
    return GetKrb5Value(*place, section, key);
  }
  const Result<IniFile> file = IniFile::Open(path);
  if (!file.ok()) return file.status();
  if (!file->stamp().exists) return Status::System(ENOENT, file->path());
  return file->document().Get(section, key);
}

Result<int> GetSectionValue(const char* path, const char* section, const char* key, char* buffer, int size) {
  if (path == nullptr || section == nullptr || key == nullptr || buffer == nullptr) {
    return Status::Failure(EINVAL, "a path, a section, a key or a buffer is missing");
  }
  const Result<std::optional<std::string>> value = FindValue(path, section, key);
  const std::string name = std::string(path) + ": " + key + " in [" + section + "]";
  if (!value.ok()) return value.status();
  if (!*value) return Status::System(ENOENT, name);
  if (size <= 0 || (*value)->size() >= static_cast<std::size_t>(size)) return Status::System(ERANGE, name);
  std::memcpy(buffer, (*value)->c_str(), (*value)->size() + 1);
  return static_cast<int>((*value)->size());
}

// Servers name their temporary files by where they are on this system: what lies below the root
// already is taken as it is.
Result<std::string> Locate(std::string_view path) {
  const Root root = Root::Current();
  const std::string below = root.directory() + "/";
  if (!root.is_box() && path.substr(0, below.size()) == below) path.remove_prefix(below.size() - 1);
  return root.Locate(path);
}

}  // namespace
}  // namespace vorn

int KLIBCFileGetSectionValue(const char* path, const char* section, const char* key, char* buffer, int size) {
  const vorn::Result<int> length = vorn::GetSectionValue(path, section, key, buffer, size);
  return length.ok() ? *length : vorn::ToResult(length.status());
}

int KLIBCFileExist(const char* path) {
  const vorn::Result<std::string> place = vorn::Locate(path == nullptr ? "" : path);
  return place.ok() && access(place->c_str(), F_OK) == 0 ? 1 : 0;
}
