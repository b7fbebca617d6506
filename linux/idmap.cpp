#include <netdb.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <memory>

#include "error.h"
#include "idmap_mappings.h"
#include "ini_file.h"
#include "lists.h"
#include "lock.h"
#include "nfsconf.h"
#include "unicode.h"

namespace vorn {
namespace {

constexpr char kFile[] = "/etc/idmapd.conf";

// Of a domain: what the ID mapper has room for, NFS4_MAX_DOMAIN_LEN of nfsidmap.h with its NUL.
constexpr std::size_t kLongestDomain = 511;

// What a record holds besides its mappings, in the first of its own words.
struct Holding {
  ConfigurationLock lock;
  std::string path;  // the file that it was read of
  FileStamp stamp;
  std::string domain;  // as it was handed out
};

Holding* HoldingOf(const _tag_nfs_id_map_& record) { return static_cast<Holding*>(record.platform[0]); }

// ---------------------------------------------------------------------------------------------
// The domain that holds where the file names none: idmapd.conf(5).

std::string CanonicalHostName() {
  char name[HOST_NAME_MAX + 1] = "";
  if (gethostname(name, sizeof name - 1) != 0) return "";
  addrinfo hints{};
  hints.ai_flags = AI_CANONNAME;
  addrinfo* found = nullptr;
  if (getaddrinfo(name, nullptr, &hints, &found) != 0) return name;
  const std::unique_ptr<addrinfo, void (*)(addrinfo*)> owner(found, &freeaddrinfo);
  return found->ai_canonname == nullptr ? name : found->ai_canonname;
}

std::string DefaultDomain() {
  const std::string host = CanonicalHostName();
  const std::size_t dot = host.find('.');
  return dot == std::string::npos || dot + 1 == host.size() ? "localdomain" : host.substr(dot + 1);
}

std::optional<std::string> DomainIn(const IniDocument& document) { return document.Get("General", "Domain"); }

// ---------------------------------------------------------------------------------------------
// Reading.

Status FillTable(const IniDocument& document, KLIBSZHASH** table) {
  for (const IniEntry& entry : document.Entries("Static")) {
    if (KLIBCSzHashSetValue(table, entry.key.c_str(), entry.value.c_str()) < 0) {
      return Status::Failure(KLIBCErrGet(), "the table of mappings cannot be filled");
    }
  }
  return {};
}

struct Free {
  void operator()(_tag_nfs_id_map_* record) const { VORNNFSIDMapFree(record); }
};
using IDMap = std::unique_ptr<_tag_nfs_id_map_, Free>;

// Nobody waits for this record's lock while a name server is asked.
Result<std::string> DomainBeforeLocking() {
  const Result<IniFile> file = IniFile::Open(kFile);
  if (!file.ok()) return file.status();
  const std::optional<std::string> stored = DomainIn(file->document());
  return stored ? *stored : DefaultDomain();
}

Result<IDMap> ReadIDMap() {
  const Result<std::string> domain_before = DomainBeforeLocking();
  if (!domain_before.ok()) return domain_before.status();
  IDMap record(new _tag_nfs_id_map_{});
  auto* holding = new Holding;
  record->platform[0] = holding;
  if (!holding->lock.status().ok()) return holding->lock.status();
  const Result<IniFile> file = IniFile::Open(kFile);
  if (!file.ok()) return file.status();
  holding->path = file->path();
  holding->stamp = file->stamp();
  holding->domain = DomainIn(file->document()).value_or(*domain_before);
  record->domain = strdup(holding->domain.c_str());
  record->table = KLIBCSzHashAlloc(0);
  if (record->domain == nullptr || record->table == nullptr) return Status::System(ENOMEM, kFile);
  if (Status status = FillTable(file->document(), &record->table); !status.ok()) return status;
  return record;
}

// ---------------------------------------------------------------------------------------------
// Writing.

Status StoreDomain(const std::string& domain, IniDocument* document) {
  if (domain.empty()) {
    document->Remove("General", "Domain");
    return {};
  }
  const std::optional<IniValue> value = IniValue::From(domain);
  if (!value || domain.size() > kLongestDomain || !IsPlainText(domain))
    return Status::Failure(kRefusedText, "idmapd.conf(5) cannot carry the domain");
  document->Set(*IniSection::From("General"), *IniKey::From("Domain"), *value);
  return {};
}

// What the record holds, if it was read of that file.
Holding* HoldingOf(const _tag_nfs_id_map_& record, const IniFile& file) {
  Holding* holding = HoldingOf(record);
  return holding != nullptr && holding->path == file.path() ? holding : nullptr;
}

// A default domain that the caller left alone is not written down.
bool IsNewDomain(const char* domain, const Holding* holding) {
  return domain != nullptr && (holding == nullptr || domain != holding->domain);
}

// What a further write of the same record begins with.
void Remember(const FileStamp& stamp, const _tag_nfs_id_map_& record, Holding* holding) {
  holding->stamp = stamp;
  if (record.domain != nullptr) holding->domain = record.domain;
}

Status WriteIDMap(const char* path, const _tag_nfs_id_map_* record) {
  if (path == nullptr || record == nullptr) return Status::Failure(EINVAL, "no path, or no record");
  const ConfigurationLock lock;
  if (!lock.status().ok()) return lock.status();
  Result<IniFile> file = IniFile::Open(path);
  if (!file.ok()) return file.status();
  Holding* holding = HoldingOf(*record, *file);
  if (holding != nullptr && !IsSameFile(holding->stamp, file->stamp())) return ChangedBehind(file->path());
  IniDocument* document = &file->document();
  if (IsNewDomain(record->domain, holding)) {
    if (Status status = StoreDomain(record->domain, document); !status.ok()) return status;
  }
  if (record->table != nullptr) {
    if (Status status = StoreMappings(*record->table, document); !status.ok()) return status;
  }
  const Result<FileStamp> stamp = file->Save();
  if (!stamp.ok()) return stamp.status();
  if (holding != nullptr) Remember(*stamp, *record, holding);
  return {};
}

// ---------------------------------------------------------------------------------------------
// Mappings without a record.

Status ReadMappings(KLIBSZHASH** hash, const char* filter) {
  if (hash == nullptr || *hash == nullptr) return Status::Failure(EINVAL, "no hash");
  const Result<IniFile> file = IniFile::Open(kFile);
  if (!file.ok()) return file.status();
  const CaselessSubstring wanted(filter == nullptr ? "" : filter);
  for (const IniEntry& entry : file->document().Entries("Static")) {
    if (!wanted.IsIn(entry.key) && !wanted.IsIn(entry.value)) continue;
    if (KLIBCSzHashSetValue(hash, entry.key.c_str(), entry.value.c_str()) < 0) {
      return Status::Failure(KLIBCErrGet(), "the table of mappings cannot be filled");
    }
  }
  return {};
}

}  // namespace
}  // namespace vorn

_tag_nfs_id_map_* VORNNFSIDMapGet() {
  vorn::Result<vorn::IDMap> record = vorn::ReadIDMap();
  if (record.ok()) return record->release();
  vorn::ToResult(record.status());
  return nullptr;
}

int VORNNFSIDMapSet(const char* path, const _tag_nfs_id_map_* record) {
  return vorn::ToResult(vorn::WriteIDMap(path, record));
}

void VORNNFSIDMapFree(_tag_nfs_id_map_* record) {
  if (record == nullptr) return;
  std::free(record->domain);
  KLIBCSzHashFree(record->table);
  delete vorn::HoldingOf(*record);
  delete record;
}

int VORNNFSStaticMapGet(KLIBSZHASH** hash, const char* filter) {
  return vorn::ToResult(vorn::ReadMappings(hash, filter));
}

int VORNNFSStaticMapAppend(KLIBSZHASH** table, const KLIBSZHASH* pairs) {
  if (pairs == nullptr) return vorn::ToResult(vorn::Status::Failure(EINVAL, "no pairs"));
  for (const KLIBSZHASH::Pair& pair : pairs->pairs) {
    if (KLIBCSzHashSetValue(table, pair.first.c_str(), pair.second.c_str()) < 0) return -1;
  }
  return 0;
}

int VORNNFSStaticMapRemove(KLIBSZHASH* table, const KLIBSZLIST* principals) {
  if (table == nullptr || principals == nullptr) {
    return vorn::ToResult(vorn::Status::Failure(EINVAL, "no table, or no principals"));
  }
  for (int i = 0; i < principals->count; ++i) KLIBCSzHashRemoveKey(table, KLIBCSzListGet(principals, i));
  return 0;
}
