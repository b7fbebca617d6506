#include "idmap.h"

#include <netdb.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <memory>

#include "configuration_lock.h"
#include "idmap_mappings.h"
#include "ini_file.h"
#include "unicode.h"

namespace vorn {
namespace {

// In bytes: libnfsidmap has room for NFS4_MAX_DOMAIN_LEN (nfsidmap.h) with the terminating NUL.
constexpr std::size_t kLongestDomain = 511;

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

Status StoreDomain(const std::string& domain, IniDocument* document) {
  if (domain.empty()) {
    document->Remove("General", "Domain");
    return {};
  }
  const std::optional<IniValue> value = IniValue::From(domain);
  if (!value || domain.size() > kLongestDomain || !IsPlainText(domain))
    return Status::Failure(kRefusedText, "idmapd.conf(5) cannot represent the domain");
  document->Set(*IniSection::From("General"), *IniKey::From("Domain"), *value);
  return {};
}

}  // namespace

Result<std::optional<std::string>> ReadConfiguredDomain(Box& box) {
  const Result<SharedIniFile> file = IniFile::Open(box, kIDMapFile);
  if (!file.ok()) return file.status();
  return (*file)->document().Get("General", "Domain");
}

std::string DefaultDomain() {
  const std::string host = CanonicalHostName();
  const std::size_t dot = host.find('.');
  return dot == std::string::npos || dot + 1 == host.size() ? "localdomain" : host.substr(dot + 1);
}

Result<IDMappings> ReadIDMappings(Box& box) {
  const Result<SharedIniFile> file = IniFile::Open(box, kIDMapFile);
  if (!file.ok()) return file.status();
  IDMappings mappings;
  for (IniEntry& entry : (*file)->document().Entries("Static")) {
    mappings.push_back({std::move(entry.key), std::move(entry.value)});
  }
  return mappings;
}

Status WriteIDMap(Box& box, const std::string& path, const IDMapChange& change) {
  const ConfigurationLock lock(box);
  if (!lock.status().ok()) return lock.status();
  Result<IniEditor> file = IniEditor::Open(box, path);
  if (!file.ok()) return file.status();
  if (change.domain) {
    if (Status status = StoreDomain(*change.domain, &file->document()); !status.ok()) return status;
  }
  if (change.mappings) {
    if (Status status = StoreMappings(*change.mappings, &file->document()); !status.ok()) return status;
  }
  return file->Save();
}

}  // namespace vorn
