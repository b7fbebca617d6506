#include "nfs_configuration.h"

#include <algorithm>
#include <cstring>
#include <optional>
#include <string_view>

namespace vorn {
namespace {

constexpr char kFile[] = "/etc/nfs.conf";
constexpr char kFolder[] = "/etc/nfs.conf.d";

// The names that nfs.conf(5) reads in the folder.
bool IsConfigurationFile(std::string_view name) {
  constexpr std::string_view kEnding = ".conf";
  return name.front() != '.' && name.size() > kEnding.size() && name.substr(name.size() - kEnding.size()) == kEnding;
}

}  // namespace

Result<NFSConfiguration> NFSConfiguration::Open(Box& box) {
  NFSConfiguration configuration;
  if (Status status = configuration.Add(box, kFile); !status.ok()) return status;
  const Result<std::shared_ptr<const StoredFolder>> folder = box.List(kFolder);
  if (!folder.ok()) return folder.status();
  for (const std::string& name : (*folder)->names) {
    if (!IsConfigurationFile(name)) continue;
    if (Status status = configuration.Add(box, std::string(kFolder) + "/" + name); !status.ok()) return status;
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

Status NFSConfiguration::Add(Box& box, const std::string& path) {
  Result<SharedIniFile> file = IniFile::Open(box, path);
  if (file.ok()) files_.push_back(std::move(*file));
  return file.status();
}

// The last file that gives the key a value, or any file if none does.
const IniFile& NFSConfiguration::Deciding(const char* section, const char* key) const {
  const auto has_value = [&](const SharedIniFile& file) { return file->document().Get(section, key).has_value(); };
  const auto last = std::find_if(files_.rbegin(), files_.rend(), has_value);
  return last == files_.rend() ? *files_.front() : **last;
}

}  // namespace vorn
