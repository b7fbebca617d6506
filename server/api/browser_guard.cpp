#include "browser_guard.h"

#include <arpa/inet.h>
#include <netinet/in.h>

#include <algorithm>
#include <cstddef>
#include <string>
#include <utility>

#include "header_value.h"

namespace vorn::server {
namespace {

constexpr std::string_view kHttp = "http://";
constexpr std::string_view kHttps = "https://";

bool IsPort(std::string_view text) {
  return text.size() <= 5 && std::all_of(text.begin(), text.end(), [](char c) { return c >= '0' && c <= '9'; });
}

// Returns whether `host` is `name`, or `name` with a port. Both are in lower case.
bool HasName(std::string_view host, std::string_view name) {
  if (host.substr(0, name.size()) != name) return false;
  const std::string_view rest = host.substr(name.size());
  return rest.empty() || (rest.front() == ':' && IsPort(rest.substr(1)));
}

bool IsLoopback(std::string_view host) {
  return HasName(host, "localhost") || HasName(host, "127.0.0.1") || HasName(host, "[::1]");
}

// Returns whether the Host header is an IP address, with any port or none.
bool IsAddress(const std::string& host) {
  in6_addr address{};
  if (host.empty() || host.front() != '[') {
    const std::string name = host.substr(0, host.find(':'));
    return inet_pton(AF_INET, name.c_str(), &address) == 1 && HasName(host, name);
  }
  const std::size_t end = host.find(']');
  return end != std::string::npos && inet_pton(AF_INET6, host.substr(1, end - 1).c_str(), &address) == 1 &&
         HasName(host, host.substr(0, end + 1));
}

bool HasPrefix(std::string_view text, std::string_view prefix) { return text.substr(0, prefix.size()) == prefix; }

// A URL may contain the default port of its scheme or omit it.
std::string_view WithoutPort(std::string_view host, std::string_view port) {
  const bool has_port = host.size() > port.size() && host.substr(host.size() - port.size()) == port;
  return has_port ? host.substr(0, host.size() - port.size()) : host;
}

}  // namespace

OwnNames::OwnNames(std::vector<std::string> names, const std::string& machine) : machine_(LowerAscii(machine)) {
  Set(std::move(names));
}

void OwnNames::Set(std::vector<std::string> names) {
  for (std::string& name : names) name = LowerAscii(name);
  const std::lock_guard<std::mutex> lock(mutex_);
  names_ = std::move(names);
}

bool OwnNames::HasGivenName(std::string_view host) const {
  const std::lock_guard<std::mutex> lock(mutex_);
  return std::any_of(names_.begin(), names_.end(), [host](const std::string& name) { return HasName(host, name); });
}

bool OwnNames::HaveGiven() const {
  const std::lock_guard<std::mutex> lock(mutex_);
  return !names_.empty();
}

bool OwnNames::Include(std::string_view host, bool tls) const {
  const std::string lower = LowerAscii(host);
  if (IsLoopback(lower) || HasGivenName(lower)) return true;
  return tls && (IsAddress(lower) || (!machine_.empty() && HasName(lower, machine_)));
}

bool OwnNames::AreOrigin(std::string_view origin, std::string_view host, bool tls) const {
  const std::string own = LowerAscii(host);
  const std::string lower = LowerAscii(origin);
  const std::string_view sender = lower;
  if (tls || (HasGivenName(own) && HasPrefix(sender, kHttps))) {
    return HasPrefix(sender, kHttps) && !own.empty() &&
           WithoutPort(sender.substr(kHttps.size()), ":443") == WithoutPort(own, ":443");
  }
  return IsLoopback(own) && HasPrefix(sender, kHttp) &&
         WithoutPort(sender.substr(kHttp.size()), ":80") == WithoutPort(own, ":80");
}

bool IsOwnFetch(std::string_view site) { return site == "same-origin" || site == "none"; }

}  // namespace vorn::server
