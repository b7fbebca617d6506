#include "export_hosts.h"

#include <netdb.h>

#include <algorithm>
#include <array>
#include <utility>

#include "exports_client.h"
#include "lines.h"
#include "owned.h"
#include "state_file.h"

namespace vorn {
namespace {

constexpr char kHostsFile[] = "/var/lib/vorn/export-hosts";

}  // namespace

std::optional<std::vector<std::string>> ResolveHost(const std::string& name) {
  addrinfo hints{};
  hints.ai_socktype = SOCK_DGRAM;  // each address once
  addrinfo* found = nullptr;
  const int error = getaddrinfo(name.c_str(), nullptr, &hints, &found);
  const Owned<addrinfo, freeaddrinfo> owner(found);
  if (error == EAI_AGAIN || error == EAI_SYSTEM || error == EAI_FAIL) return std::nullopt;
  std::vector<std::string> addresses;
  for (const addrinfo* entry = found; error == 0 && entry != nullptr; entry = entry->ai_next) {
    std::array<char, NI_MAXHOST> text{};
    if (getnameinfo(entry->ai_addr, entry->ai_addrlen, text.data(), text.size(), nullptr, 0, NI_NUMERICHOST) == 0) {
      addresses.emplace_back(text.data());
    }
  }
  std::sort(addresses.begin(), addresses.end());
  return addresses;
}

Result<HostAddresses> ReadExportHosts(Box& box) {
  const Result<StoredFile> file = box.Read(kHostsFile);
  if (!file.ok()) return file.status();
  HostAddresses hosts;
  for (const std::string_view line : LinesOf(file->text)) {
    const std::vector<std::string_view> words = WordsOf(line);
    if (words.size() < 2) continue;
    std::vector<std::string>& addresses = hosts[std::string(words[0])];
    addresses.insert(addresses.end(), words.begin() + 1, words.end());
  }
  return hosts;
}

Status StoreExportHosts(Box& box, const HostAddresses& hosts) {
  std::string text;
  for (const auto& [name, addresses] : hosts) {
    text += name;
    for (const std::string& address : addresses) text += " " + address;
    text += "\n";
  }
  return StoreState(box, kHostsFile, text);
}

void AddServedHosts(const KernelCache& addresses, HostAddresses* hosts) {
  HostAddresses served;
  const auto entries = addresses.Entries();
  for (const KernelCache::Entry& entry : entries ? *entries : std::vector<KernelCache::Entry>()) {
    if (entry.is_negative || entry.words.size() < 3 || entry.words[0] != "nfsd") continue;
    for (const std::string_view name : PartsOf(entry.words[2], ',')) {
      if (IsExportHostName(name)) served[ExportClientKey(name)].push_back(entry.words[1]);
    }
  }
  hosts->merge(served);
}

std::set<std::string> ResolveExportHosts(const std::set<std::string>& names, const HostResolver& resolve,
                                         HostAddresses* hosts) {
  std::set<std::string> resolved;
  for (const std::string& name : names) {
    std::optional<std::vector<std::string>> addresses = resolve(name);
    if (!addresses) break;
    if (addresses->empty()) continue;
    (*hosts)[name] = std::move(*addresses);
    resolved.insert(name);
  }
  return resolved;
}

}  // namespace vorn
