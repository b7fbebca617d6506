// Finds out who has sent a request, from its head alone.
#ifndef VORN_SERVER_AUTHENTICATOR_H
#define VORN_SERVER_AUTHENTICATOR_H

#include <sys/types.h>

#include <mutex>
#include <optional>
#include <string>
#include <string_view>

#include "caller.h"
#include "message.h"
#include "sessions.h"
#include "token_store.h"

namespace vorn::server {

// The accounts that need no sign-in at the Unix socket, besides root and the account of the server itself, which could
// as well change the files of the box.
struct LocalGroups {
  std::optional<gid_t> administrators{};
  std::optional<gid_t> readers{};
};

// Thread-safe. Does not wait.
class Authenticator {
 public:
  // The stores must outlive this.
  Authenticator(TokenStore& tokens, Sessions& sessions, LocalGroups groups)
      : tokens_(tokens), sessions_(sessions), groups_(groups) {}

  // Concerns the requests that begin from now on.
  void SetGroups(LocalGroups groups);

  // Returns the caller, or nullptr if the request has no valid credentials. A token or session in the head decides
  // alone; without one, the peer of a Unix socket does.
  //
  // `secure`: the client reached the server over TLS, so that a cookie is accepted. The peer of the Unix socket is then
  // a proxy, whose own rights its clients must not have.
  CallerPtr Identify(const Head& head, bool secure) const;

 private:
  LocalGroups groups() const;
  CallerPtr CallerOfToken(const Head& head, std::string_view secret) const;
  CallerPtr CallerAtSocket(const Peer::Credentials& peer) const;

  TokenStore& tokens_;
  Sessions& sessions_;
  mutable std::mutex mutex_;
  LocalGroups groups_;  // with mutex_
};

// The Set-Cookie header (RFC 6265, 4.1; prefix "__Host-": RFC 6265bis, 4.1.3) that gives a browser this session, or
// takes it away if `secret` is empty. The browser keeps it until it ends.
std::string SessionCookie(std::string_view secret);

}  // namespace vorn::server

#endif  // VORN_SERVER_AUTHENTICATOR_H
