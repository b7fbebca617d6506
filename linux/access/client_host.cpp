#include "client_host.h"

#include <algorithm>
#include <optional>
#include <utility>

#include "exports_client.h"
#include "host_pattern.h"

namespace vorn {
namespace {

bool Contains(const std::vector<std::string>& list, const std::string& text) {
  return std::find(list.begin(), list.end(), text) != list.end();
}

void FindNames(const NameService& service, ClientHost* client) {
  const std::string& address = client->addresses.front();
  std::optional<std::vector<std::string>> names = service.names_of(address);
  client->is_away = !names.has_value();
  if (!names || names->empty()) return;
  const std::optional<std::vector<std::string>> addresses = service.resolve(names->front());
  client->is_name_confirmed = !addresses || Contains(*addresses, address);
  client->names = std::move(*names);
}

bool IsHost(ClientHost* client, const std::string& host, const NameService& service, HostAddresses* hosts) {
  const std::string key = ExportClientKey(host);
  if (!IsExportHostName(key)) return key == client->addresses.front();
  auto known = hosts->find(key);
  if (known == hosts->end()) {
    if (client->is_away) return false;
    std::optional<std::vector<std::string>> addresses = service.resolve(key);
    client->is_away = !addresses.has_value();
    if (!addresses) return false;
    known = hosts->emplace(key, std::move(*addresses)).first;
  }
  return Contains(known->second, client->addresses.front());
}

bool IsInNetwork(const ClientHost& client, const std::string& network) {
  const auto addresses = ReadExportNetwork(network);
  const auto address = ReadExportNetwork(client.addresses.front());
  return addresses && address && Contains(*addresses, *address);
}

bool IsInPattern(const ClientHost& client, const std::string& pattern) {
  return std::any_of(client.names.begin(), client.names.end(),
                     [&](const std::string& name) { return MatchesHostPattern(name, pattern); });
}

// mountd looks for the address and the short name, too, but only of a client that has a name.
bool IsInNetgroup(const ClientHost& client, const std::string& netgroup, const NameService& service) {
  if (client.names.empty()) return false;
  std::vector<std::string> hosts = client.names;
  const std::string& name = client.names.front();
  hosts.push_back(client.addresses.front());
  hosts.push_back(name.substr(0, name.find('.')));
  return std::any_of(hosts.begin(), hosts.end(),
                     [&](const std::string& host) { return service.is_member(netgroup, host); });
}

}  // namespace

ClientHost FindClientHost(const std::string& client, const NameService& service, bool needs_names) {
  ClientHost host;
  if (const std::optional<std::string> address = HostAddress(client)) {
    host.addresses = {*address};
  } else {
    std::optional<std::vector<std::string>> addresses = service.resolve(client);
    host.is_away = !addresses.has_value();
    if (addresses) host.addresses = std::move(*addresses);
    // IPv4 first: most clients of a box with both families mount over it.
    std::stable_partition(host.addresses.begin(), host.addresses.end(),
                          [](const std::string& text) { return text.find(':') == std::string::npos; });
  }
  if (host.addresses.empty()) return host;
  if (needs_names) FindNames(service, &host);
  return host;
}

bool NeedsNames(const ExportList& exports) {
  return std::any_of(exports.begin(), exports.end(), [](const TableExport& one) {
    return one.kind == ExportKind::kPattern || one.kind == ExportKind::kNetgroup;
  });
}

bool MatchesExport(ClientHost* client, const TableExport& one, const NameService& service, HostAddresses* hosts) {
  if (client->addresses.empty()) return false;
  switch (one.kind) {
    case ExportKind::kHost:
      return IsHost(client, one.client, service, hosts);
    case ExportKind::kNetwork:
      return IsInNetwork(*client, one.client);
    case ExportKind::kPattern:
      return IsInPattern(*client, one.client);
    case ExportKind::kNetgroup:
      return IsInNetgroup(*client, one.client.substr(1), service);
    case ExportKind::kEverybody:
      return true;
  }
  return false;
}

}  // namespace vorn
