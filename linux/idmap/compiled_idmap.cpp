#include "compiled_idmap.h"

#include <unordered_set>
#include <utility>

#include "configuration_lock.h"
#include "idmap.h"
#include "mapping_table.h"
#include "translation_methods.h"
#include "users.h"

namespace vorn {
namespace {

constexpr std::size_t kMostSentences = 20;

Mappings MappingsOf(const std::vector<IniFound>& stored) {
  Mappings mappings;
  mappings.reserve(stored.size());
  for (const IniFound& mapping : stored) mappings.emplace_back(mapping.key, mapping.value);
  return mappings;
}

std::string VersionLine(const IniFile& file) {
  std::string line = "# " + file.location();
  for (const std::uint64_t part : file.version().state) line += " " + std::to_string(part);
  return line + "\n";
}

// The comments come first: the reader ignores an incomplete last line, which a comment would complete.
std::string DaemonSettings(const IniFiles& files) {
  const std::vector<const IniFile*> read = files.files();
  std::string text;
  for (std::size_t i = 1; i < read.size(); ++i) text += VersionLine(*read[i]);
  const IniFile& main = *read.front();
  return text + (UseOnlyCompiledMappings(files) ? main.document().TextWithout("Static") : main.document().Text());
}

Status Put(Box& box, const std::string& path, const std::string& text) {
  const Result<StoredFile> before = box.Read(path);
  if (!before.ok()) return before.status();
  const bool is_same = before->version.exists && before->text == text;
  return is_same ? Status() : box.Replace(path, text, before->version);
}

Result<std::vector<std::string>> DescribeDeadMappings(Box& box, const std::vector<IniFound>& stored) {
  const Result<std::shared_ptr<const Accounts>> accounts = ReadAccounts(box);
  if (!accounts.ok()) return accounts.status();
  std::unordered_set<std::string_view> names;
  for (const Account& account : **accounts) names.insert(account.name);
  std::vector<std::string> sentences;
  std::size_t count = 0;
  for (const IniFound& mapping : stored) {
    if (names.count(mapping.value) != 0 || ++count > kMostSentences) continue;
    sentences.push_back(mapping.Where() + ": " + std::string(mapping.key) + " is mapped to " +
                        std::string(mapping.value) + ", who is not in /etc/passwd");
  }
  if (count > kMostSentences) sentences.push_back(std::to_string(count - kMostSentences) + " further such mappings");
  return sentences;
}

}  // namespace

Result<std::vector<std::string>> CompileIDMap(Box& box) {
  const ConfigurationLock lock(box);
  if (!lock.status().ok()) return lock.status();
  const Result<std::shared_ptr<const IDMap>> map = ReadIDMap(box);
  if (!map.ok()) return map.status();
  const IniFiles& files = (*map)->files();
  const std::vector<IniFound> stored = files.Settings("Static");
  // The table is first: settings without mappings must not exist without it.
  const Status table = Put(box, kMappingTableFile, RenderMappingTable(MappingsOf(stored)));
  if (!table.ok()) return table;
  const Status settings = Put(box, kDaemonSettingsFile, DaemonSettings(files));
  return settings.ok() ? DescribeDeadMappings(box, stored) : settings;
}

}  // namespace vorn
