// Keeps web pages of other sites out, which a browser on this machine would let reach loopback.
#ifndef VORN_SERVER_BROWSER_GUARD_H
#define VORN_SERVER_BROWSER_GUARD_H

#include <string_view>

namespace vorn::server {

// Whether a Host header (RFC 9110, 7.2) names this machine: localhost, 127.0.0.1 or [::1], with any
// port or none. A page whose own name was made to resolve to 127.0.0.1 fails here.
bool IsLoopbackHost(std::string_view host);

// Whether an Origin header (RFC 6454, 7) is http or https at such a host. "null" is not.
bool IsLoopbackOrigin(std::string_view origin);

}  // namespace vorn::server

#endif  // VORN_SERVER_BROWSER_GUARD_H
