#include "nfs_configuration.h"

#include <algorithm>
#include <cstring>
#include <filesystem>
#include <optional>
#include <utility>

#include "root.h"

namespace vorn {
namespace {

namespace fs = std::filesystem;

// The names that count in the folder, in the order of strverscmp(3), which is the services'.
Result<std::vector<std::string>> Names() {
  const Result<std::string> folder = Root::Current().Locate(kNfsConfFolder);
  if (!folder.ok()) return folder.status();
  std::vector<std::string> names;
  std::error_code ignored;
  for (const fs::directory_entry& entry : fs::directory_iterator(*folder, ignored)) {
    const fs::path name = entry.path().filename();
    const bool counts = name.extension() == ".conf" && !entry.is_directory(ignored);
    if (counts && name.native().front() != '.') names.push_back(name);
  }
  const auto before = [](const std::string& a, const std::string& b) { return strverscmp(a.c_str(), b.c_str()) < 0; };
  std::sort(names.begin(), names.end(), before);
  return names;
}

}  // namespace

Result<NFSConfiguration> NFSConfiguration::Open() {
  NFSConfiguration configuration;
  if (Status status = configuration.Add("/etc/nfs.conf"); !status.ok()) return status;
  const Result<std::vector<std::string>> names = Names();
  if (!names.ok()) return names.status();
  for (const std::string& name : *names) {
    if (Status status = configuration.Add(std::string(kNfsConfFolder) + "/" + name); !status.ok()) return status;
  }
  return configuration;
}

Status NFSConfiguration::Read(const char* section, const char* key, int largest, std::int32_t* value) const {
  const Result<std::optional<int>> number = Deciding(section, key).Number(section, key, largest);
  if (number.ok() && *number) *value = **number;
  return number.status();
}

Status NFSConfiguration::Read(const char* section, const char* key, std::int32_t* value) const {
  const Result<std::optional<bool>> on = Deciding(section, key).Switch(section, key);
  if (on.ok() && *on) *value = **on ? 1 : 0;
  return on.status();
}

Status NFSConfiguration::Read(const char* section, const char* key, char* text, std::size_t size) const {
  const IniFile& file = Deciding(section, key);
  const std::string value = file.document().Get(section, key).value_or("");
  if (value.size() >= size) return file.Refuse(section, key, "is longer than " + std::to_string(size - 1) + " bytes");
  std::memcpy(text, value.c_str(), value.size() + 1);
  return {};
}

Status NFSConfiguration::Add(const std::string& path) {
  Result<IniFile> file = IniFile::Open(path);
  if (file.ok()) files_.push_back(std::move(*file));
  return file.status();
}

// The last file that has a value, or any one.
const IniFile& NFSConfiguration::Deciding(const char* section, const char* key) const {
  const auto has = [&](const IniFile& file) { return file.document().Get(section, key).has_value(); };
  const auto last = std::find_if(files_.rbegin(), files_.rend(), has);
  return last == files_.rend() ? files_.front() : *last;
}

}  // namespace vorn
