// The names and addresses of hosts, as rpc.mountd(8) asks for them.
#ifndef VORN_LINUX_ACCESS_HOST_NAMES_H
#define VORN_LINUX_ACCESS_HOST_NAMES_H

#include <chrono>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "export_hosts.h"

namespace vorn {

// The name service. Each function may wait for a name server.
struct NameService {
  HostResolver resolve = ResolveHost;

  // Returns the names of an address, the canonical one first; none if it has no name. nullopt: no answer. The others
  // are the aliases of the canonical one.
  std::function<std::optional<std::vector<std::string>>(const std::string& address)> names_of;

  // Whether a host, by name or address, belongs to a netgroup (innetgr(3)).
  std::function<bool(const std::string& netgroup, const std::string& host)> is_member;

  // The name service of this system.
  static NameService OfSystem();

  using Clock = std::function<std::chrono::steady_clock::time_point()>;

  // Returns a name service that asks `service` for each thing once, and asks nothing more after it has waited for ten
  // seconds altogether for answers that did not come. A server that cannot be reached costs no time, so that the names
  // in /etc/hosts are still found. Not thread-safe; copies share the memory.
  static NameService Remembering(const NameService& service, Clock clock = std::chrono::steady_clock::now);
};

// Returns the usual text of an address, "10.0.0.1" also for "::ffff:10.0.0.1"; nullopt for every other text.
std::optional<std::string> HostAddress(const std::string& text);

}  // namespace vorn

#endif  // VORN_LINUX_ACCESS_HOST_NAMES_H
