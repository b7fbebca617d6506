#include "keytab.h"

#include <sys/stat.h>

#include <algorithm>
#include <cerrno>

#include "call_rights.h"
#include "configuration_lock.h"
#include "files.h"
#include "ini_text.h"
#include "nfs_record.h"
#include "nfsconf.h"
#include "notice.h"
#include "unicode.h"

namespace vorn {
namespace {

constexpr std::size_t kLargest = std::size_t{1} << 20;
constexpr mode_t kOwnerOnly = 0600;

// A file of this system.
Result<std::string> ReadLocalFile(const std::string& path) {
  struct stat info {};
  if (lstat(path.c_str(), &info) != 0) return Status::System(errno, path);
  if (!S_ISREG(info.st_mode)) return Status::Failure(EINVAL, path + " is no regular file");
  Result<FileText> file = ReadFile(path);
  if (!file.ok()) return file.status();
  return std::move(file->text);
}

Result<std::string> ReadFileOfBox(Box& box, const std::string& path) {
  Result<StoredFile> file = box.Read(path);
  if (!file.ok()) return file.status();
  if (!file->version.exists) return Status::System(ENOENT, file->location);
  return std::move(file->text);
}

Result<std::string> ReadNewKeytab(Box& box, const std::string& path) {
  Result<std::string> content = !HasCallContext() || IsUpload(path) ? ReadLocalFile(path) : ReadFileOfBox(box, path);
  if (content.ok() && content->size() > kLargest) return Status::System(EFBIG, path);
  return content;
}

// The server's own principal: the first one of the NFS service, else the first one.
const std::string& OwnPrincipal(const std::vector<KeytabKey>& keys) {
  const auto found = std::find_if(keys.begin(), keys.end(),
                                  [](const KeytabKey& key) { return key.principal.compare(0, 4, "nfs/") == 0; });
  return found == keys.end() ? keys.front().principal : found->principal;
}

// Checks that the NFS configuration record can represent the principal. This happens before the installation,
// because the record must name the principal afterwards.
Status CheckPrincipal(const std::string& principal) {
  if (principal.size() < sizeof(KeytabEntry::principal) && IsPlainText(principal) &&
      IniValue::From(principal).has_value())
    return {};
  return Status::Failure(kRefusedText, "nfs.conf(5) cannot represent the principal " + principal);
}

// Clients use a ticket until it expires, and the service can only read it with the key for which it was made.
void NameLostKeys(const std::string& former, const std::vector<KeytabKey>& keys) {
  const Result<std::vector<KeytabKey>> before = ReadKeytab(former);
  if (!before.ok()) return;  // there was none
  for (const KeytabKey& lost : *before) {
    const bool is_kept = std::any_of(keys.begin(), keys.end(), [&lost](const KeytabKey& key) {
      return key.principal == lost.principal && key.version == lost.version;
    });
    if (is_kept) continue;
    Notice("the new keytab has no key of version " + std::to_string(lost.version) + " of " + lost.principal +
           ": tickets for it are refused until users sign in anew and rpc.gssd(8) of their machines is restarted; a "
           "keytab with the former and the new keys interrupts nobody");
    return;
  }
}

// Keys are readable by root only, whatever the mode of an older file is.
Status Install(Box& box, const std::string& content, const std::vector<KeytabKey>& keys) {
  if (Status status = box.SetMode(kKeytabFile, kOwnerOnly); !status.ok()) return status;
  const Result<StoredFile> before = box.Read(kKeytabFile);
  if (!before.ok()) return before.status();
  Status replaced = box.Replace(kKeytabFile, content, before->version, kOwnerOnly);
  if (replaced.ok()) NameLostKeys(before->text, keys);
  return replaced;
}

}  // namespace

Status ImportKeytab(Box& box, const std::string& path) {
  const Result<std::string> content = ReadNewKeytab(box, path);
  if (!content.ok()) return content.status();
  const Result<std::vector<KeytabKey>> keys = ReadKeytab(*content);
  if (!keys.ok()) return keys.status();
  if (keys->empty()) return Status::Failure(kNoKeytab, "the keytab has no key");
  const std::string& principal = OwnPrincipal(*keys);
  if (Status status = CheckPrincipal(principal); !status.ok()) return status;
  const ConfigurationLock lock(box);
  if (!lock.status().ok()) return lock.status();
  const Status installed = Install(box, *content, *keys);
  return installed.ok() ? StoreKerberosPrincipal(box, principal) : installed;
}

Result<std::vector<KeytabKey>> ListKeytab(Box& box, const std::string& path) {
  const Result<StoredFile> file = box.Read(path);
  if (!file.ok()) return file.status();
  if (!file->version.exists) return std::vector<KeytabKey>();  // a box without Kerberos
  return ReadKeytab(file->text);
}

std::string WithoutKeys(const std::string& path, const std::string& content) {
  return path == kKeytabFile ? PrintKeytab(content) : content;
}

}  // namespace vorn
