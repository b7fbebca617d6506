#include "setting_findings.h"

#include <algorithm>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "call.h"
#include "idmap.h"
#include "nfs_configuration.h"
#include "nfs_record.h"
#include "nfs_settings.h"
#include "translation_methods.h"

namespace vorn {
namespace {

constexpr char kMend[] = "Correct the file.";

// Splits "/etc/nfs.conf:3: the reason" as the readers of configuration files report it. Returns what follows the place,
// and fills the place with the box's path.
std::string TakePlace(const Box& box, const std::string& sentence, VORN::HealthSubject* subject) {
  const std::size_t end = sentence.find(": ");
  const std::size_t colon = end == std::string::npos ? end : sentence.rfind(':', end - 1);
  if (colon == std::string::npos || sentence.front() != '/') return sentence;
  const std::string number = sentence.substr(colon + 1, end - colon - 1);
  if (number.empty() || number.find_first_not_of("0123456789") != std::string::npos) return sentence;
  subject->file = box.root().OnBox(sentence.substr(0, colon));
  subject->line = std::stoi(number);
  return sentence.substr(end + 2);
}

std::string PlaceOf(const VORN::HealthSubject& subject) {
  return subject.file.empty() ? "" : "Line " + std::to_string(subject.line) + " of " + subject.file + ": ";
}

// The keys that WriteNFSRecord() writes, by section.
std::set<std::pair<std::string, std::string>> OwnKeys() {
  std::set<std::pair<std::string, std::string>> keys;
  for (const NFSSetting& setting : kNFSSettings) keys.emplace(setting.section, setting.key);
  for (const DaemonPort& daemon : kDaemonPorts) keys.emplace(daemon.section, daemon.key);
  for (const char* minor : kMinorVersions) keys.emplace("nfsd", minor);
  return keys;
}

const IniFile* FindFile(const IniFiles& files, const std::string& location) {
  const std::vector<const IniFile*> all = files.files();
  const auto found =
      std::find_if(all.begin(), all.end(), [&](const IniFile* file) { return file->location() == location; });
  return found == all.end() ? nullptr : *found;
}

// Adds a finding if another file decides over the key that `own` has.
void CompareSetting(const Box& box, const IniFiles& files, const IniFile& own, const std::string& section,
                    const std::string& key, Findings* findings) {
  const std::optional<IniSetting> written = own.document().Find(section, key);
  const std::optional<IniFound> in_force = files.FindStored(section, key);
  if (!written || !in_force || in_force->file == &own || in_force->stored == written->value) return;
  VORN::HealthSubject subject;
  subject.file = box.root().OnBox(in_force->file->location());
  subject.line = in_force->line;
  subject.setting = section + " " + key;
  std::string text = PlaceOf(subject) + key + " is \"";
  text.append(in_force->stored).append("\" and overrides the value \"").append(written->value);
  text += "\" that was saved here: clients get the service with the first value.";
  findings->Warning(std::move(subject), std::move(text), "Remove this line, or save the value that it has.");
}

}  // namespace

Status FindSettingFaults(const HealthInput& input, Findings* findings) {
  const auto add = [&](const std::string& sentence, const char* effect) {
    VORN::HealthSubject subject;
    const std::string reason = TakePlace(input.box, sentence, &subject);
    const std::string text = PlaceOf(subject) + reason + ". " + effect;
    findings->Error(std::move(subject), text, kMend);
  };
  const Result<NFSConfiguration> configuration = NFSConfiguration::Open(input.box);
  if (!configuration.ok()) return configuration.status();
  if (const Status& status = configuration->files().CheckReadable(); !status.ok()) {
    add(status.reason(), "The next start of NFS fails.");
  }
  const Result<std::shared_ptr<const IDMap>> map = ReadIDMap(input.box);
  if (!map.ok()) return map.status();
  if (const Status& status = (*map)->files().CheckReadable(); !status.ok()) {
    add(status.reason(), "No user of a client is mapped.");
  }
  for (const std::string& sentence : MissingPlugins(input.box, (*map)->files())) {
    add(sentence, "No user of a client is mapped.");
  }
  return {};
}

// The readers tell the current call what they ignore.
Status FindIgnoredSettings(const HealthInput& input, Findings* findings) {
  VORN::CallDescription description;
  if (const VORN::CallContext* call = VORN::CallContext::Current(); call != nullptr) description = call->description();
  description.may_write = false;
  const VORN::CallContext remarks(std::move(description));
  const Result<NFSConfiguration> configuration = NFSConfiguration::Open(input.box);
  if (!configuration.ok()) return configuration.status();
  if (const Status& readable = configuration->files().CheckReadable(); !readable.ok()) return readable;
  const Result<NFSConfRecord> record = ReadNFSRecord(input.box);
  if (!record.ok()) return record.status();
  for (const std::string& sentence : remarks.warnings()) {
    VORN::HealthSubject subject;
    const std::string reason = TakePlace(input.box, sentence, &subject);
    const std::string text = PlaceOf(subject) + reason + ".";
    findings->Warning(std::move(subject), text, kMend);
  }
  return {};
}

Status FindOverriddenSettings(const HealthInput& input, Findings* findings) {
  const Result<NFSConfiguration> configuration = NFSConfiguration::Open(input.box);
  if (!configuration.ok()) return configuration.status();
  const Result<std::string> location = input.box.root().Locate(kNFSRecordFile);
  if (!location.ok()) return location.status();
  const IniFiles& files = configuration->files();
  if (const IniFile* own = FindFile(files, *location); own != nullptr) {
    for (const auto& [section, key] : OwnKeys()) CompareSetting(input.box, files, *own, section, key, findings);
  }
  const Result<std::shared_ptr<const IDMap>> map = ReadIDMap(input.box);
  if (!map.ok()) return map.status();
  const IniFiles& mapping = (*map)->files();
  CompareSetting(input.box, mapping, *mapping.files().front(), "General", "Domain", findings);
  return {};
}

}  // namespace vorn
