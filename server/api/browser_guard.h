// Refuses requests that an administrator's browser makes for pages of other sites (cross-site request forgery).
#ifndef VORN_SERVER_BROWSER_GUARD_H
#define VORN_SERVER_BROWSER_GUARD_H

#include <mutex>
#include <string>
#include <string_view>
#include <vector>

#include "header_value.h"

namespace vorn::server {

// The host names by which browsers reach this server. Without TLS: localhost, 127.0.0.1, [::1], and the given names,
// which a proxy with TLS forwards. With TLS: all these, the machine's own name, and every IP address. Thread-safe.
class OwnNames {
 public:
  // Names have no port; an IPv6 address is in brackets. Upper and lower case are the same. `machine` is the name of
  // this machine; empty if it is not known.
  explicit OwnNames(std::vector<std::string> names = {}, const std::string& machine = {});

  // Replaces the given names.
  void Set(std::vector<std::string> names);

  // `tls`: whether the connection has TLS.

  // Returns whether a Host header (RFC 9110, 7.2) has one of the names, with any port or none. A site whose name
  // resolves to an address of this server has another name ("DNS rebinding"), and its name is no address.
  bool Include(std::string_view host, bool tls) const;

  // Returns whether there are given names: then a proxy may send requests to a Unix socket.
  bool HaveGiven() const;

  // Returns whether the client has sent its request over TLS, to this server or to a proxy: cookies are safe.
  bool AreSecure(std::string_view host, bool tls) const { return tls || HasGivenName(LowerAscii(host)); }

  // Returns whether an Origin header (RFC 6454, 7) is the origin of this server itself, as a request with this Host
  // header reached it: same scheme, host and port. Another port of this machine is another origin, and so is "null".
  bool AreOrigin(std::string_view origin, std::string_view host, bool tls) const;

 private:
  bool HasGivenName(std::string_view host) const;

  const std::string machine_;
  mutable std::mutex mutex_;
  std::vector<std::string> names_;  // with mutex_
};

// Returns whether a Sec-Fetch-Site header (W3C Fetch Metadata) says that the browser makes the request for a page of
// this server or for the user: "same-origin" or "none".
bool IsOwnFetch(std::string_view site);

}  // namespace vorn::server

#endif  // VORN_SERVER_BROWSER_GUARD_H
