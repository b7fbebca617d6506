// The service's keytab: /etc/nfs/krb5.keytab.
#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include "error.h"
#include "file_descriptor.h"
#include "files.h"
#include "ini_text.h"
#include "keytab_file.h"
#include "lock.h"
#include "nfsconf.h"
#include "root.h"
#include "unicode.h"

namespace vorn {
namespace {

constexpr char kFile[] = "/etc/nfs/krb5.keytab";
constexpr std::size_t kLargest = std::size_t{1} << 20;

Result<std::string> ReadUpload(const std::string& path) {
  struct stat info {};
  if (lstat(path.c_str(), &info) != 0) return Status::System(errno, path);
  if (!S_ISREG(info.st_mode)) return Status::Failure(EINVAL, path + " is no regular file");
  Result<FileText> file = ReadFile(path);
  if (!file.ok()) return file.status();
  if (file->text.size() > kLargest) return Status::System(EFBIG, path);
  return std::move(file->text);
}

// The service's own principal: the first of the NFS service, else the first.
const std::string& OwnPrincipal(const std::vector<KeytabKey>& keys) {
  const auto found = std::find_if(keys.begin(), keys.end(),
                                  [](const KeytabKey& key) { return key.principal.compare(0, 4, "nfs/") == 0; });
  return found == keys.end() ? keys.front().principal : found->principal;
}

// Whether the configuration record can carry it: once the keytab is installed it has to.
Status CheckPrincipal(const std::string& principal) {
  if (principal.size() < sizeof(KeytabEntry::principal) && IsPlainText(principal) && IniValue::From(principal))
    return {};
  return Status::Failure(kRefusedText, "nfs.conf(5) cannot carry the principal " + principal);
}

// Keys are for root alone, whatever mode an older file had.
Status Install(const std::string& content) {
  const Result<std::string> path = Root::Current().Locate(kFile);
  if (!path.ok()) return path.status();
  if (chmod(path->c_str(), 0600) != 0 && errno != ENOENT) return Status::System(errno, *path);
  const Result<FileText> before = ReadFileOrNothing(*path);
  if (!before.ok()) return before.status();
  return ReplaceFile(*path, content, before->stamp, 0600);
}

Status StorePrincipal(const std::string& principal) {
  NFSConfRecord record;
  if (VORNNFSConfGet(&record) < 0) return Status::Failure(KLIBCErrGet(), "the principal cannot be stored");
  std::fill(std::begin(record.kerberos_principal), std::end(record.kerberos_principal), '\0');
  principal.copy(record.kerberos_principal, sizeof record.kerberos_principal - 1);
  if (VORNNFSConfSet(&record) < 0) return Status::Failure(KLIBCErrGet(), "the principal cannot be stored");
  return {};
}

Status Import(const std::string& path) {
  const Result<std::string> content = ReadUpload(path);
  if (!content.ok()) return content.status();
  const Result<std::vector<KeytabKey>> keys = ReadKeytab(*content);
  if (!keys.ok()) return keys.status();
  if (keys->empty()) return Status::Failure(kNoKeytab, "not a keytab to use: there is no key in it");
  const std::string& principal = OwnPrincipal(*keys);
  if (Status status = CheckPrincipal(principal); !status.ok()) return status;
  const ConfigurationLock lock;
  if (!lock.status().ok()) return lock.status();
  const Status installed = Install(*content);
  return installed.ok() ? StorePrincipal(principal) : installed;
}

struct FreeEntries {
  void operator()(KeytabEntry* list) const { VORNNFSKeytabInfoFree(list); }
};
using Entries = std::unique_ptr<KeytabEntry, FreeEntries>;

Result<Entries> List(const char* path) {
  const Result<std::string> place = Root::Current().Locate(path);
  if (!place.ok()) return place.status();
  const Result<FileText> file = ReadFileOrNothing(*place);
  if (!file.ok()) return file.status();
  if (!file->stamp.exists) return Entries();  // a box without Kerberos has no keys
  const Result<std::vector<KeytabKey>> keys = ReadKeytab(file->text);
  if (!keys.ok()) return keys.status();
  Entries list;
  for (auto key = keys->rbegin(); key != keys->rend(); ++key) {
    Entries entry(new KeytabEntry{});
    entry->version = key->version;
    snprintf(entry->principal, sizeof entry->principal, "%s", key->principal.c_str());
    snprintf(entry->enc_type, sizeof entry->enc_type, "%s", key->enc_type.c_str());
    entry->next = list.release();
    list = std::move(entry);
  }
  return list;
}

}  // namespace
}  // namespace vorn

int VORNNFSKeytabImport(const char* path) {
  const vorn::Status status = vorn::Import(path);
  if (vorn::ToResult(status) == 0) return 0;
  return status.code() == vorn::kNoKeytab ? VORNNFS_KEYTAB_NO_KEYTAB : VORNNFS_KEYTAB_FAILED;
}

int VORNNFSKeytabInfoGet(const char* path, KeytabEntry** list) {
  vorn::Result<vorn::Entries> entries = vorn::List(path);
  if (!entries.ok()) return vorn::ToResult(entries.status());
  *list = entries->release();
  return 0;
}

void VORNNFSKeytabInfoFree(KeytabEntry* list) {
  while (list != nullptr) {
    KeytabEntry* const next = list->next;
    delete list;
    list = next;
  }
}
