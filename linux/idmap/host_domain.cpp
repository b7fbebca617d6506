#include "host_domain.h"

#include <netdb.h>
#include <unistd.h>

#include <algorithm>
#include <climits>
#include <memory>
#include <mutex>
#include <optional>
#include <system_error>
#include <thread>
#include <utility>

#include "files.h"
#include "hosts_text.h"

namespace vorn {
namespace {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::minutes kRefreshAfter{5};

std::string HostName() {
  char name[HOST_NAME_MAX + 1] = "";
  return gethostname(name, sizeof name - 1) == 0 ? name : "";
}

// Asks the sources of nsswitch.conf(5), name servers among them.
std::string ResolveCanonicalName() {
  std::string name = HostName();
  addrinfo hints{};
  hints.ai_flags = AI_CANONNAME;
  addrinfo* found = nullptr;
  if (getaddrinfo(name.c_str(), nullptr, &hints, &found) != 0) return name;
  const std::unique_ptr<addrinfo, void (*)(addrinfo*)> owner(found, &freeaddrinfo);
  return found->ai_canonname == nullptr ? name : found->ai_canonname;
}

std::string NameInHostsFile() {
  const Result<FileText> file = ReadFileOrNothing("/etc/hosts");
  return file.ok() ? CanonicalName(file->text, HostName()) : HostName();
}

std::string DomainOf(const std::string& host) {
  const std::size_t dot = host.find('.');
  return dot == std::string::npos || dot + 1 == host.size() ? "localdomain" : host.substr(dot + 1);
}

}  // namespace

std::string CanonicalName(const std::string& hosts, const std::string& host) {
  for (const HostsLine& line : ReadHosts(hosts)) {
    if (std::find(line.names.begin(), line.names.end(), host) != line.names.end()) return line.names.front();
  }
  return host;
}

struct HostDomain::State {
  std::mutex mutex;
  std::string domain;
  std::optional<Clock::time_point> answered;
  bool is_asking = false;
  Resolver resolve;
  std::chrono::seconds refresh_after;
};

HostDomain::HostDomain(const std::string& first_name, Resolver resolve, std::chrono::seconds refresh_after)
    : state_(std::make_shared<State>()) {
  state_->domain = DomainOf(first_name);
  state_->resolve = std::move(resolve);
  state_->refresh_after = refresh_after;
}

std::string HostDomain::Get() {
  const std::lock_guard lock(state_->mutex);
  const bool is_fresh = state_->answered && Clock::now() - *state_->answered < state_->refresh_after;
  if (is_fresh || state_->is_asking) return state_->domain;
  const auto ask = [state = state_] {
    std::string domain = DomainOf(state->resolve());
    const std::lock_guard answer(state->mutex);
    state->domain = std::move(domain);
    state->answered = Clock::now();
    state->is_asking = false;
  };
  try {
    std::thread(ask).detach();
    state_->is_asking = true;
  } catch (const std::system_error&) {
    // The system has no thread to spare: a later call tries again.
  }
  return state_->domain;
}

std::string HostDomain::Last() const {
  const std::lock_guard lock(state_->mutex);
  return state_->domain;
}

HostDomain& HostDomain::OfThisHost() {
  // Never destroyed: the thread may run while the process exits.
  static auto* domain = new HostDomain(NameInHostsFile(), ResolveCanonicalName, kRefreshAfter);
  return *domain;
}

}  // namespace vorn
