#include "tls_files.h"

#include <syslog.h>

#include <algorithm>
#include <optional>
#include <utility>
#include <vector>

#include "private_file.h"
#include "secret.h"
#include "self_signed.h"
#include "small_file.h"

namespace vorn::server {
namespace {

constexpr std::time_t kDay = std::time_t{24} * 60 * 60;
constexpr std::time_t kRenewal = 30 * kDay;
constexpr std::time_t kWarning = 14 * kDay;

// A key that every user may read is refused.
std::optional<std::string> ReadKey(const std::string& path, std::string* error) {
  std::optional<SmallFile> file = ReadSmallFile(path, error);
  if (!file) return std::nullopt;
  if ((file->mode & 07) == 0) return std::move(file->text);
  *error = path + ": every user may use the key; its mode must be 0600 or 0640";
  Wipe(&file->text);
  return std::nullopt;
}

std::string WithoutBrackets(const std::string& name) {
  return name.front() == '[' ? name.substr(1, name.size() - 2) : name;
}

bool CoversAll(const TlsIdentity& identity, const HostNames& names) {
  return std::all_of(names.each.begin(), names.each.end(),
                     [&identity](const std::string& name) { return identity.Covers(WithoutBrackets(name)); });
}

TlsIdentityPtr MakeAndStore(const Settings& settings, const std::string& path, std::string* error) {
  std::vector<std::string> names;
  for (const std::string& name : settings.host_names.each) names.push_back(WithoutBrackets(name));
  for (const std::string& name : NamesOfThisMachine()) {
    if (std::find(names.begin(), names.end(), name) == names.end()) names.push_back(name);
  }
  std::optional<std::string> text = MakeSelfSigned(names, error);
  if (!text || !ReplacePrivateFile(path, *text, error)) return nullptr;
  TlsIdentityPtr made = TlsIdentity::Make(*text, *text, error);
  Wipe(&*text);
  return made;
}

}  // namespace

bool WantsTls(const Settings& settings) {
  const auto& addresses = settings.listen.each;
  return std::any_of(addresses.begin(), addresses.end(), HasTls);
}

TlsIdentityPtr ReadTlsFiles(const Settings& settings, std::string* error) {
  const std::optional<SmallFile> certificates = ReadSmallFile(settings.certificate.path, error);
  std::optional<std::string> key;
  if (certificates) key = ReadKey(settings.key.path, error);
  if (!key) return nullptr;
  TlsIdentityPtr identity = TlsIdentity::Make(certificates->text, *key, error);
  if (!identity) *error = settings.certificate.path + ", " + settings.key.path + ": " + *error;
  Wipe(&*key);
  return identity;
}

TlsIdentityPtr ReadSelfSigned(const std::string& path, std::string* error) {
  std::optional<std::string> text = ReadPrivateFile(path, error);
  if (!text || text->empty()) return nullptr;
  TlsIdentityPtr identity = TlsIdentity::Make(*text, *text, error);
  if (!identity) *error = path + ": " + *error;
  Wipe(&*text);
  return identity;
}

TlsIdentityPtr OpenTlsIdentity(const Settings& settings, const std::string& path, std::time_t now, std::string* error) {
  if (!settings.certificate.path.empty()) return ReadTlsFiles(settings, error);
  TlsIdentityPtr identity = ReadSelfSigned(path, error);
  if (identity && identity->not_after() - now > kRenewal && CoversAll(*identity, settings.host_names)) return identity;
  if (!error->empty()) syslog(LOG_WARNING, "%s; another certificate is made", error->c_str());
  error->clear();
  identity = MakeAndStore(settings, path, error);
  if (identity) syslog(LOG_NOTICE, "%s: made a self-signed certificate", path.c_str());
  return identity;
}

std::string ExpiryWarning(const TlsIdentity& identity, std::time_t now) {
  const std::time_t left = identity.not_after() - now;
  if (left > kWarning) return "";
  if (left <= 0) return "The certificate has expired; clients refuse it";
  return "The certificate expires in " + std::to_string(left / kDay) + " days";
}

}  // namespace vorn::server
