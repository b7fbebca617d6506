#include "nfs_record.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <limits>
#include <optional>

#include "configuration_lock.h"
#include "ini_file.h"
#include "nfs_configuration.h"

namespace vorn {
namespace {

constexpr char kFile[] = "/etc/nfs.conf.d/vorn.conf";
constexpr char kHeading[] =
    "# The NFS settings of this box, kept by its management. Other lines here are left alone.\n";

// The section of the settings that nfs-utils has no key for, and of those that it must not read while they
// are switched off. nfs-utils ignores sections that it does not know.
constexpr char kOurs[] = "vorn";

// ---------------------------------------------------------------------------------------------
// Reading.

// Without our own switch, custom ports are on if an administrator has fixed one of the ports.
Status ReadPorts(const NFSConfiguration& configuration, NFSConfRecord* record) {
  std::int32_t statd = 0;
  std::int32_t nlm = 0;
  if (Status s = configuration.Read("statd", "port", kLargestPort, &statd); !s.ok()) return s;
  if (Status s = configuration.Read("lockd", "port", kLargestPort, &nlm); !s.ok()) return s;
  record->custom_port_enable = statd != 0 || nlm != 0 ? 1 : 0;
  if (Status s = configuration.Read(kOurs, "custom-ports", &record->custom_port_enable); !s.ok()) return s;
  if (Status s = configuration.Read(kOurs, "statd-port", kLargestPort, &record->statd_port); !s.ok()) return s;
  if (Status s = configuration.Read(kOurs, "nlm-port", kLargestPort, &record->nlm_port); !s.ok()) return s;
  if (record->custom_port_enable == 0) return {};
  record->statd_port = statd;
  record->nlm_port = nlm;
  return {};
}

// ---------------------------------------------------------------------------------------------
// Writing: only our own file.

void Put(IniDocument* document, const char* section, const char* key, const IniValue& value) {
  document->Set(*IniSection::From(section), *IniKey::From(key), value);
}

void PutSwitch(IniDocument* document, const char* section, const char* key, bool on) {
  Put(document, section, key, *IniValue::From(on ? "y" : "n"));
}

// rpc.nfsd(8) enables version 4 for a minor version that is enabled by name. Each minor version is therefore
// disabled together with version 4; while version 4 is on, the administrator chooses them in nfs.conf.
void PutVersion4(IniDocument* document, bool on) {
  PutSwitch(document, "nfsd", "vers4", on);
  for (const char* minor : {"vers4.0", "vers4.1", "vers4.2"}) {
    if (on) {
      document->Remove("nfsd", minor);
    } else {
      PutSwitch(document, "nfsd", minor, false);
    }
  }
}

void PutPorts(IniDocument* document, const NFSConfRecord& record) {
  const bool on = record.custom_port_enable != 0;
  PutSwitch(document, kOurs, "custom-ports", on);
  Put(document, kOurs, "statd-port", IniValue::From(record.statd_port));
  Put(document, kOurs, "nlm-port", IniValue::From(record.nlm_port));
  const struct {
    const char* section;
    const char* key;
    std::int32_t port;
  } keys[] = {
      {"statd", "port", record.statd_port}, {"lockd", "port", record.nlm_port}, {"lockd", "udp-port", record.nlm_port}};
  for (const auto& k : keys) {
    if (on) {
      Put(document, k.section, k.key, IniValue::From(k.port));
    } else {
      document->Remove(k.section, k.key);
    }
  }
}

Status PutPrincipal(IniDocument* document, const NFSConfRecord& record) {
  const char* text = record.kerberos_principal;
  const std::size_t length = strnlen(text, sizeof record.kerberos_principal);
  if (length == sizeof record.kerberos_principal) return Status::Failure(kRefusedText, "the principal does not end");
  if (length == 0) {
    document->Remove(kOurs, "kerberos-principal");
    return {};
  }
  const std::optional<IniValue> value = IniValue::From(text);
  if (!value) return Status::Failure(kRefusedText, "nfs.conf(5) cannot carry the principal");
  Put(document, kOurs, "kerberos-principal", *value);
  return {};
}

Status CheckNumbers(const NFSConfRecord& record) {
  const auto is_port = [](std::int32_t port) { return port >= 0 && port <= kLargestPort; };
  if (record.read_size < 0 || record.write_size < 0) return Status::Failure(EINVAL, "a transfer size is negative");
  if (!is_port(record.statd_port) || !is_port(record.nlm_port))
    return Status::Failure(EINVAL, "a port is out of range");
  return {};
}

Status PutRecord(const NFSConfRecord& record, IniDocument* document) {
  PutVersion4(document, record.enable_nfs_v4 != 0);
  PutSwitch(document, "mountd", "manage-gids", record.unix_pri_enable != 0);
  Put(document, kOurs, "read-size", IniValue::From(record.read_size));
  Put(document, kOurs, "write-size", IniValue::From(record.write_size));
  PutPorts(document, record);
  return PutPrincipal(document, record);
}

}  // namespace

Result<NFSConfRecord> ReadNFSRecord(Box& box) {
  const Result<NFSConfiguration> configuration = NFSConfiguration::Open(box);
  if (!configuration.ok()) return configuration.status();
  NFSConfRecord record{};
  record.enable_nfs_v4 = 1;  // the default of rpc.nfsd(8); the defaults of all other fields are 0
  constexpr int kAny = std::numeric_limits<std::int32_t>::max();
  if (Status s = configuration->Read(kOurs, "read-size", kAny, &record.read_size); !s.ok()) return s;
  if (Status s = configuration->Read(kOurs, "write-size", kAny, &record.write_size); !s.ok()) return s;
  if (Status s = configuration->Read("nfsd", "vers4", &record.enable_nfs_v4); !s.ok()) return s;
  if (Status s = configuration->Read("mountd", "manage-gids", &record.unix_pri_enable); !s.ok()) return s;
  if (Status s = ReadPorts(*configuration, &record); !s.ok()) return s;
  char* principal = record.kerberos_principal;
  const Status status = configuration->Read(kOurs, "kerberos-principal", principal, sizeof record.kerberos_principal);
  return status.ok() ? Result<NFSConfRecord>(record) : status;
}

Status WriteNFSRecord(Box& box, const NFSConfRecord& record) {
  if (Status status = CheckNumbers(record); !status.ok()) return status;
  const ConfigurationLock lock(box);
  if (!lock.status().ok()) return lock.status();
  Result<IniEditor> file = IniEditor::Open(box, kFile, kHeading);
  if (!file.ok()) return file.status();
  const Status status = PutRecord(record, &file->document());
  return status.ok() ? file->Save() : status;
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
