#include "nfsconf.h"

#include <cerrno>
#include <cstring>
#include <limits>
#include <optional>

#include "error.h"
#include "ini_file.h"
#include "lock.h"
#include "nfs_configuration.h"

namespace vorn {
namespace {

constexpr char kFile[] = "/etc/nfs.conf.d/vorn.conf";
constexpr char kHeading[] =
    "# The NFS settings of this box, kept by its management. Other lines here are left alone.\n";

// What nfs-utils has no key for, and what it must not see while it is switched off.
constexpr char kOurs[] = "vorn";

// Our own file as this thread's record was read of it. The record has no room for that, and an edit by hand between
// the reading and the writing of a record must not be lost.
struct Origin {
  std::string path;  // empty: nothing was read
  FileStamp stamp;
};
thread_local Origin origin;

// ---------------------------------------------------------------------------------------------
// Reading.

// Our own switch, or if nobody ever set it: whether an administrator fixed one of the ports.
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

Status ReadRecord(NFSConfRecord* result) {
  if (result == nullptr) return Status::Failure(EINVAL, "no record");
  // Before the values, so that an edit in between is noticed, too.
  const Result<IniFile> own = IniFile::Open(kFile);
  if (!own.ok()) return own.status();
  const Result<NFSConfiguration> configuration = NFSConfiguration::Open();
  if (!configuration.ok()) return configuration.status();
  NFSConfRecord record{};
  record.enable_nfs_v4 = 1;  // as rpc.nfsd(8) without a key; sizes, ports and rpc.mountd's groups begin at 0
  constexpr int kAny = std::numeric_limits<std::int32_t>::max();
  if (Status s = configuration->Read(kOurs, "read-size", kAny, &record.read_size); !s.ok()) return s;
  if (Status s = configuration->Read(kOurs, "write-size", kAny, &record.write_size); !s.ok()) return s;
  if (Status s = configuration->Read("nfsd", "vers4", &record.enable_nfs_v4); !s.ok()) return s;
  if (Status s = configuration->Read("mountd", "manage-gids", &record.unix_pri_enable); !s.ok()) return s;
  if (Status s = ReadPorts(*configuration, &record); !s.ok()) return s;
  char* principal = record.kerberos_principal;
  if (Status s = configuration->Read(kOurs, "kerberos-principal", principal, sizeof record.kerberos_principal);
      !s.ok()) {
    return s;
  }
  *result = record;
  origin = {own->path(), own->stamp()};
  return {};
}

// ---------------------------------------------------------------------------------------------
// Writing: our own file only.

void Put(IniDocument* document, const char* section, const char* key, const IniValue& value) {
  document->Set(*IniSection::From(section), *IniKey::From(key), value);
}

void PutSwitch(IniDocument* document, const char* section, const char* key, bool on) {
  Put(document, section, key, *IniValue::From(on ? "y" : "n"));
}

// A minor version that is asked for by name brings version 4 back to life, so each is denied with it;
// with it on, they are the administrator's to choose in nfs.conf.
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

Status WriteRecord(const NFSConfRecord* record) {
  if (record == nullptr) return Status::Failure(EINVAL, "no record");
  if (Status status = CheckNumbers(*record); !status.ok()) return status;
  const ConfigurationLock lock;
  if (!lock.status().ok()) return lock.status();
  Result<IniFile> file = IniFile::Open(kFile, kHeading);
  if (!file.ok()) return file.status();
  if (origin.path == file->path() && !IsSameFile(origin.stamp, file->stamp())) return ChangedBehind(file->path());
  IniDocument* document = &file->document();
  PutVersion4(document, record->enable_nfs_v4 != 0);
  PutSwitch(document, "mountd", "manage-gids", record->unix_pri_enable != 0);
  Put(document, kOurs, "read-size", IniValue::From(record->read_size));
  Put(document, kOurs, "write-size", IniValue::From(record->write_size));
  if (Status status = PutPrincipal(document, *record); !status.ok()) return status;
  PutPorts(document, *record);
  const Result<FileStamp> saved = file->Save();
  if (saved.ok()) origin = {};
  return saved.status();
}

}  // namespace
}  // namespace vorn

int VORNNFSConfGet(NFSConfRecord* record) { return vorn::ToResult(vorn::ReadRecord(record)); }

int VORNNFSConfSet(const NFSConfRecord* record) { return vorn::ToResult(vorn::WriteRecord(record)); }
