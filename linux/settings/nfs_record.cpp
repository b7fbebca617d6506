#include "nfs_record.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <optional>
#include <string>
#include <vector>

#include "configuration_lock.h"
#include "nfs_configuration.h"
#include "nfs_settings.h"
#include "notice.h"

namespace vorn {
namespace {

using Type = NFSSetting::Type;

constexpr char kHeading[] =
    "# The NFS settings of this box, kept by its management. Other lines here are left alone.\n";

// ---------------------------------------------------------------------------------------------
// Reading.

NFSConfRecord Defaults() {
  NFSConfRecord record{};
  record.enable_nfs_v4 = 1;  // the default of rpc.nfsd(8); the defaults of all other fields are 0
  return record;
}

void ReadSetting(const NFSConfiguration& configuration, const NFSSetting& setting, NFSConfRecord* record) {
  if (setting.type == Type::kPrincipal) {
    char* field = record->kerberos_principal;
    const std::string text = configuration.Text(setting.section, setting.key, sizeof record->kerberos_principal);
    std::memcpy(field, text.c_str(), text.size() + 1);
    return;
  }
  std::int32_t& field = record->*setting.number;
  if (setting.type == Type::kSize) field = configuration.Number(setting.section, setting.key, field);
  if (setting.type == Type::kPort) field = configuration.Port(setting.section, setting.key, field);
  if (setting.type == Type::kSwitch) {
    field = configuration.Switch(setting.section, setting.key, field != 0) ? 1 : 0;
  }
}

int PortInForce(const NFSConfiguration& configuration, const DaemonPort& daemon) {
  const int tcp = configuration.Port(daemon.section, "port", 0);  // the lock manager's UDP port follows its TCP port
  return configuration.Port(daemon.section, daemon.key, tcp);
}

// The ports are custom if one of them is fixed, by whatever file. Only then the daemons' keys count.
void ReadPortsInForce(const NFSConfiguration& configuration, NFSConfRecord* record) {
  const int statd = PortInForce(configuration, kDaemonPorts[0]);
  const int nlm = PortInForce(configuration, kDaemonPorts[1]);
  if (statd != 0 || nlm != 0) record->custom_port_enable = 1;
  if (record->custom_port_enable == 0) return;
  record->statd_port = statd;
  record->nlm_port = nlm;
}

NFSConfRecord RecordOf(const NFSConfiguration& configuration) {
  NFSConfRecord record = Defaults();
  for (const NFSSetting& setting : kNFSSettings) ReadSetting(configuration, setting, &record);
  for (const char* minor : kMinorVersions) {
    if (configuration.Switch("nfsd", minor, false)) record.enable_nfs_v4 = 1;
  }
  ReadPortsInForce(configuration, &record);
  return record;
}

// ---------------------------------------------------------------------------------------------
// Comparing and checking.

std::int32_t Truth(std::int32_t value) { return value != 0 ? 1 : 0; }

bool IsSame(const NFSSetting& setting, const NFSConfRecord& a, const NFSConfRecord& b) {
  if (setting.type == Type::kPrincipal) return std::strcmp(a.kerberos_principal, b.kerberos_principal) == 0;
  if (setting.type == Type::kSwitch) return Truth(a.*setting.number) == Truth(b.*setting.number);
  return a.*setting.number == b.*setting.number;
}

// Whether the ports that are in force, or that are remembered, differ.
bool ArePortsSame(const NFSConfRecord& a, const NFSConfRecord& b) {
  return a.statd_port == b.statd_port && a.nlm_port == b.nlm_port &&
         Truth(a.custom_port_enable) == Truth(b.custom_port_enable);
}

Status CheckFields(const NFSConfRecord& record) {
  const char* text = record.kerberos_principal;
  const std::size_t length = strnlen(text, sizeof record.kerberos_principal);
  if (length == sizeof record.kerberos_principal) return Status::Failure(kRefusedText, "the principal does not end");
  for (const NFSSetting& setting : kNFSSettings) {
    if (setting.type != Type::kSize && setting.type != Type::kPort) continue;
    const std::int32_t number = record.*setting.number;
    const bool in_range = number >= 0 && (setting.type == Type::kSize || number <= kLargestPort);
    if (!in_range) return Status::Failure(EINVAL, std::string(setting.name) + " is out of range");
  }
  return {};
}

// The kernel's lock manager cannot bind a port that rpc.statd(8) has, and the service then does not start.
Status CheckPorts(const NFSConfRecord& now, const NFSConfRecord& wanted) {
  const bool are_equal = wanted.statd_port == wanted.nlm_port && wanted.statd_port != 0;
  if (wanted.custom_port_enable == 0 || !are_equal || ArePortsSame(now, wanted)) return {};
  return Status::Failure(EINVAL, "statd_port and nlm_port are both " + std::to_string(wanted.statd_port));
}

// rpc.nfsd(8) does not start without a version.
Status CheckVersions(const NFSConfiguration& configuration, const NFSConfRecord& now, const NFSConfRecord& wanted) {
  const bool is_switched_off = now.enable_nfs_v4 != 0 && wanted.enable_nfs_v4 == 0;
  if (!is_switched_off || configuration.Switch("nfsd", "vers3", true)) return {};
  const std::string where = configuration.files().Find("nfsd", "vers3")->Where();
  return Status::Failure(EINVAL, where + ": vers3 is off, so NFS needs version 4");
}

// ---------------------------------------------------------------------------------------------
// Planning: the change to our own file.

void Put(IniDocument* document, const char* section, const char* key, const IniValue& value) {
  document->Set(*IniSection::From(section), *IniKey::From(key), value);
}

Status PutSetting(const NFSSetting& setting, const NFSConfRecord& record, IniDocument* document) {
  if (setting.type == Type::kSwitch) {
    Put(document, setting.section, setting.key, SwitchValue(record.*setting.number != 0));
    return {};
  }
  if (setting.type != Type::kPrincipal) {
    Put(document, setting.section, setting.key, NumberValue(record.*setting.number));
    return {};
  }
  if (record.kerberos_principal[0] == '\0') {
    document->Remove(setting.section, setting.key);
    return {};
  }
  const std::optional<IniValue> value = IniValue::From(record.kerberos_principal);
  if (!value) return Status::Failure(kRefusedText, "nfs.conf(5) cannot represent the principal");
  Put(document, setting.section, setting.key, *value);
  return {};
}

// Each minor version is disabled together with version 4; while version 4 is on, the administrator chooses them.
void PutMinorVersions(bool on, IniDocument* document) {
  for (const char* minor : kMinorVersions) {
    if (on) {
      document->Remove("nfsd", minor);
    } else {
      Put(document, "nfsd", minor, SwitchValue(false));
    }
  }
}

// Ports that are switched off are removed; where another file fixes one, 0 cancels it.
Status PutDaemonPort(Box& box, const DaemonPort& daemon, const NFSConfRecord& record, IniDocument* document) {
  if (record.custom_port_enable != 0) {
    Put(document, daemon.section, daemon.key, NumberValue(record.*daemon.port));
    return {};
  }
  document->Remove(daemon.section, daemon.key);
  const Result<NFSConfiguration> others =
      NFSConfiguration::Open(box, IniFiles::Draft{kNFSRecordFile, document->Text()});
  if (!others.ok()) return others.status();
  if (PortInForce(*others, daemon) != 0) Put(document, daemon.section, daemon.key, NumberValue(0));
  return {};
}

Status PutPorts(Box& box, const NFSConfRecord& now, const NFSConfRecord& wanted, IniDocument* document) {
  const bool is_switched = Truth(now.custom_port_enable) != Truth(wanted.custom_port_enable);
  Put(document, kOwnSection, "custom-ports", SwitchValue(wanted.custom_port_enable != 0));
  for (const DaemonPort& daemon : kDaemonPorts) {
    if (!is_switched && now.*daemon.port == wanted.*daemon.port) continue;
    if (Status status = PutDaemonPort(box, daemon, wanted, document); !status.ok()) return status;
  }
  for (const NFSSetting& setting : kNFSSettings) {
    const bool changes = is_switched || !IsSame(setting, now, wanted);
    if (setting.type != Type::kPort || !changes) continue;
    if (Status status = PutSetting(setting, wanted, document); !status.ok()) return status;
  }
  return {};
}

bool IsPortSetting(const NFSSetting& setting) {
  return setting.type == Type::kPort || setting.number == &NFSConfRecord::custom_port_enable;
}

// Changes the keys of the fields that differ, and no others.
Status PutChanges(Box& box, const NFSConfRecord& now, const NFSConfRecord& wanted, IniDocument* document) {
  for (const NFSSetting& setting : kNFSSettings) {
    if (IsPortSetting(setting) || IsSame(setting, now, wanted)) continue;
    if (Status status = PutSetting(setting, wanted, document); !status.ok()) return status;
    if (setting.number == &NFSConfRecord::enable_nfs_v4) PutMinorVersions(wanted.enable_nfs_v4 != 0, document);
  }
  return ArePortsSame(now, wanted) ? Status() : PutPorts(box, now, wanted, document);
}

// ---------------------------------------------------------------------------------------------
// Verifying.

// The keys that decide over a field, the strongest first.
std::vector<std::pair<std::string, std::string>> DecidingKeys(const NFSSetting& setting) {
  std::vector<std::pair<std::string, std::string>> keys;
  if (setting.number == &NFSConfRecord::enable_nfs_v4) {
    for (const char* minor : kMinorVersions) keys.emplace_back("nfsd", minor);
  }
  for (const DaemonPort& daemon : kDaemonPorts) {
    if (daemon.port == setting.number || setting.number == &NFSConfRecord::custom_port_enable) {
      keys.emplace_back(daemon.section, daemon.key);
    }
  }
  keys.emplace_back(setting.section, setting.key);
  return keys;
}

// The failure for a field that another file decides over.
Status Overridden(const NFSConfiguration& configuration, const NFSSetting& setting, const std::string& own_file) {
  for (const auto& [section, key] : DecidingKeys(setting)) {
    const std::optional<IniFound> found = configuration.files().FindStored(section, key);
    if (!found || found->file->location() == own_file) continue;
    return Status::Failure(kOverridden, found->Where() + ": " + key + " overrides the new value of " + setting.name);
  }
  return Status::Failure(kOverridden, std::string("the new value of ") + setting.name + " would have no effect");
}

// Whether the lock manager has one port for both protocols, as it is written.
bool HasOneLockPort(const NFSConfiguration& configuration) {
  return PortInForce(configuration, kDaemonPorts[1]) == PortInForce(configuration, kDaemonPorts[2]);
}

// Checks that the record is in force.
Status Verify(const NFSConfiguration& configuration, const NFSConfRecord& now, const NFSConfRecord& wanted,
              const std::string& own_file) {
  const NFSConfRecord read = RecordOf(configuration);
  for (const NFSSetting& setting : kNFSSettings) {
    if (!IsSame(setting, read, wanted)) return Overridden(configuration, setting, own_file);
  }
  const bool sets_lock_port = now.nlm_port != wanted.nlm_port && wanted.custom_port_enable != 0;
  if (!sets_lock_port || HasOneLockPort(configuration)) return {};
  const std::string where = configuration.files().Find("lockd", "udp-port")->Where();
  return Status::Failure(kOverridden, where + ": udp-port overrides the new value of nlm_port");
}

Status VerifyDraft(Box& box, const NFSConfRecord& now, const NFSConfRecord& wanted, IniEditor* file) {
  const auto draft = NFSConfiguration::Open(box, IniFiles::Draft{kNFSRecordFile, file->document().Text()});
  return draft.ok() ? Verify(*draft, now, wanted, file->location()) : draft.status();
}

// Warns if what is in force is not the record. The record was in force in the draft, so another writer has changed a
// file since; the change itself is stored and counts as a success.
void ReadBack(Box& box, const NFSConfRecord& now, const NFSConfRecord& wanted, const std::string& own_file) {
  const Status noted = IniFiles::NoteOwnWrite(box, kNFSRecordFile);
  const Result<NFSConfiguration> stored = NFSConfiguration::Open(box);
  if (!noted.ok() || !stored.ok()) {
    Notice("the NFS settings are stored, but cannot be read back: " + (noted.ok() ? stored.status() : noted).reason());
    return;
  }
  const Status status = Verify(*stored, now, wanted, own_file);
  if (status.ok()) return;
  Notice("the NFS settings are stored, but another writer changed a file meanwhile: " + status.reason());
}

Status Check(const NFSConfiguration& configuration, const NFSConfRecord& now, const NFSConfRecord& wanted) {
  if (Status status = CheckPorts(now, wanted); !status.ok()) return status;
  return CheckVersions(configuration, now, wanted);
}

}  // namespace

Result<NFSConfRecord> ReadNFSRecord(Box& box) {
  const Result<NFSConfiguration> configuration = NFSConfiguration::Open(box);
  if (!configuration.ok()) return configuration.status();
  const auto record = box.Derive<NFSConfRecord>("", configuration->files().sources(),
                                                [&] { return Result<NFSConfRecord>(RecordOf(*configuration)); });
  if (!record.ok()) return record.status();
  return **record;
}

Status WriteNFSRecord(Box& box, const NFSConfRecord& record) {
  if (Status status = CheckFields(record); !status.ok()) return status;
  const ConfigurationLock lock(box);
  if (!lock.status().ok()) return lock.status();
  const Result<NFSConfiguration> configuration = NFSConfiguration::Open(box);
  if (!configuration.ok()) return configuration.status();
  if (Status status = configuration->files().CheckUnchanged(box); !status.ok()) return status;
  if (const Status& status = configuration->files().CheckReadable(); !status.ok()) return status;
  const NFSConfRecord now = RecordOf(*configuration);
  if (Status status = Check(*configuration, now, record); !status.ok()) return status;
  Result<IniEditor> file = IniEditor::Open(box, kNFSRecordFile, kHeading);
  if (!file.ok()) return file.status();
  if (Status status = PutChanges(box, now, record, &file->document()); !status.ok()) return status;
  if (Status status = VerifyDraft(box, now, record, &*file); !status.ok()) return status;
  if (Status status = file->Save(); !status.ok()) return status;
  ReadBack(box, now, record, file->location());
  return {};
}

Status StoreKerberosPrincipal(Box& box, const std::string& principal) {
  const ConfigurationLock lock(box);
  if (!lock.status().ok()) return lock.status();
  Result<NFSConfRecord> record = ReadNFSRecord(box);
  if (!record.ok()) return record.status();
  char* field = record->kerberos_principal;
  if (principal.size() >= sizeof record->kerberos_principal) return Status::System(ERANGE, principal);
  std::fill(field, field + sizeof record->kerberos_principal, '\0');
  principal.copy(field, principal.size());
  return WriteNFSRecord(box, *record);
}

}  // namespace vorn
