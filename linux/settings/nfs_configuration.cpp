#include "nfs_configuration.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <limits>

#include "ascii.h"
#include "notice.h"
#include "unicode.h"

namespace vorn {
namespace {

constexpr const char* kYes[] = {"1", "t", "true", "y", "yes", "on"};
constexpr const char* kNo[] = {"0", "f", "false", "n", "no", "off"};

template <std::size_t kSize>
bool IsOneOf(std::string_view word, const char* const (&words)[kSize]) {
  return std::find(std::begin(words), std::end(words), LowerAscii(word)) != std::end(words);
}

// The number at the beginning of the text in the given base (strtol(3)), if it is in the range, and where it ends.
std::optional<int> LeadingNumber(const std::string& text, int base, int largest, bool* is_whole) {
  char* end = nullptr;
  errno = 0;
  const long number = std::strtol(text.c_str(), &end, base);
  *is_whole = end != text.c_str() && *end == '\0';
  if (errno != 0 || number < 0 || number > largest) return std::nullopt;
  return static_cast<int>(number);
}

}  // namespace

Result<NFSConfiguration> NFSConfiguration::Open(Box& box, const std::optional<IniFiles::Draft>& draft) {
  Result<SharedIniFiles> files = IniFiles::Open(box, kNFSConfigurationFile, draft);
  if (!files.ok()) return files.status();
  return NFSConfiguration(std::move(*files), draft.has_value());
}

std::optional<IniFound> NFSConfiguration::Find(const char* section, const char* key) const {
  std::optional<IniFound> found = files_->Find(section, key);
  if (found || !files_->CheckReadable().ok()) return found;
  const std::optional<IniFound> unresolved = files_->FindStored(section, key);
  if (unresolved) {
    Remark(*unresolved, "refers to " + std::string(unresolved->stored.substr(1)) +
                            ", which [environment] does not define, and is ignored");
  }
  return found;
}

int NFSConfiguration::Port(const char* section, const char* key, int fallback) const {
  const std::optional<IniFound> setting = Find(section, key);
  if (!setting) return fallback;
  bool is_whole = false;
  const std::optional<int> port = LeadingNumber(std::string(setting->value), 10, kLargestPort, &is_whole);
  if (!port) Remark(*setting, "is not a port and is ignored");
  if (port && !is_whole) Remark(*setting, "is read as " + std::to_string(*port) + " by its daemon");
  return port.value_or(fallback);
}

bool NFSConfiguration::Switch(const char* section, const char* key, bool fallback) const {
  const std::optional<IniFound> setting = Find(section, key);
  if (!setting) return fallback;
  if (IsOneOf(setting->value, kYes)) return true;
  if (IsOneOf(setting->value, kNo)) return false;
  Remark(*setting, "is neither yes nor no and is ignored");
  return fallback;
}

int NFSConfiguration::Number(const char* section, const char* key, int fallback) const {
  const std::optional<IniFound> setting = Find(section, key);
  if (!setting) return fallback;
  bool is_whole = false;
  constexpr int kLargest = std::numeric_limits<int>::max();
  const std::optional<int> number = LeadingNumber(std::string(setting->value), 0, kLargest, &is_whole);
  if (number && is_whole) return *number;
  Remark(*setting, "is not a number from 0 to " + std::to_string(kLargest) + " and is ignored");
  return fallback;
}

std::string NFSConfiguration::Text(const char* section, const char* key, std::size_t size) const {
  const std::optional<IniFound> setting = Find(section, key);
  if (!setting) return "";
  std::string text = ToValidUtf8(setting->value);
  if (text.size() < size) return text;
  Remark(*setting, "is longer than " + std::to_string(size - 1) + " bytes and is ignored");
  return "";
}

void NFSConfiguration::Remark(const IniFound& setting, const std::string& why) const {
  if (is_draft_) return;
  const std::string sentence = setting.Where() + ": the value of " + std::string(setting.key) + " " + why;
  NoticeOnce(setting.file->location(), setting.file->version(), sentence);
}

}  // namespace vorn
