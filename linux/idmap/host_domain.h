// The NFSv4 domain of a host that has none configured.
#ifndef VORN_LINUX_IDMAP_HOST_DOMAIN_H
#define VORN_LINUX_IDMAP_HOST_DOMAIN_H

#include <chrono>
#include <functional>
#include <memory>
#include <string>

namespace vorn {

// Returns the canonical name of a host: the first name of the first line of `hosts` that has the name `host`, as in
// hosts(5). Returns `host` if no line has it.
std::string CanonicalName(const std::string& hosts, const std::string& host);

// The domain of the canonical host name, as idmapd.conf(5) defines the default of Domain. Finding that name may take
// a name server's time-out, so a background thread asks and the last known domain is given meanwhile. Thread-safe.
class HostDomain {
 public:
  // Returns the canonical name of this host; may block.
  using Resolver = std::function<std::string()>;

  // `first_name` is the name that is used until the resolver has answered. `refresh_after` is the age at which an
  // answer is asked for again.
  HostDomain(const std::string& first_name, Resolver resolve, std::chrono::seconds refresh_after);

  // The last known domain. Never waits. Starts the background thread if the domain is not fresh; at most one thread
  // runs at a time, and it ends with the answer. The thread may outlive this object.
  std::string Get();

  // The last known domain. Starts nothing.
  std::string Last() const;

  // The domain of this process's host. Its first name is the canonical one of /etc/hosts (hosts(5)).
  static HostDomain& OfThisHost();

 private:
  struct State;
  std::shared_ptr<State> state_;
};

}  // namespace vorn

#endif  // VORN_LINUX_IDMAP_HOST_DOMAIN_H
