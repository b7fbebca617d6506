// The addresses of the host names in export rules, as they were last resolved.
#ifndef VORN_LINUX_SERVICE_EXPORT_HOSTS_H
#define VORN_LINUX_SERVICE_EXPORT_HOSTS_H

#include <functional>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "box.h"
#include "export_table_update.h"
#include "kernel_cache.h"
#include "status.h"

namespace vorn {

// Returns the addresses of a host. nullopt: the resolver did not answer. Empty: there is no such host.
using HostResolver = std::function<std::optional<std::vector<std::string>>(const std::string& name)>;

// Asks getaddrinfo(3), as exportfs(8) does.
std::optional<std::vector<std::string>> ResolveHost(const std::string& name);

// The remembered addresses are stored in /var/lib/vorn/export-hosts: one line per name, "name address address".
Result<HostAddresses> ReadExportHosts(Box& box);
Status StoreExportHosts(Box& box, const HostAddresses& hosts);

// Adds the hosts whose name the kernel's server knows by an address ("nfsd 10.0.0.1 host.example" in the cache
// kAddressesCache) to those of which nothing is remembered.
void AddServedHosts(const KernelCache& addresses, HostAddresses* hosts);

// Resolves `names` and updates `hosts`. Stops at the first name for which the resolver does not answer, so that a name
// server that is away is awaited once. Returns the names that have an address.
std::set<std::string> ResolveExportHosts(const std::set<std::string>& names, const HostResolver& resolve,
                                         HostAddresses* hosts);

}  // namespace vorn

#endif  // VORN_LINUX_SERVICE_EXPORT_HOSTS_H
