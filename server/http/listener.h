// Listening sockets: Unix sockets, loopback addresses, and any address with TLS.
#ifndef VORN_SERVER_LISTENER_H
#define VORN_SERVER_LISTENER_H

#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "unique_fd.h"

namespace vorn::server {

// A listening socket. The destructor removes the socket file if this object created it.
class Listener {
 public:
  // `path` is the socket file to remove; empty if there is none.
  Listener(UniqueFd socket, int family, bool tls, std::string name, std::string path);
  Listener(Listener&& other) noexcept;
  Listener& operator=(Listener&&) = delete;
  ~Listener();

  UniqueFd TakeSocket() { return std::move(socket_); }
  int family() const { return family_; }             // AF_UNIX, AF_INET or AF_INET6
  bool tls() const { return tls_; }                  // its connections have TLS
  const std::string& name() const { return name_; }  // as --listen takes it

 private:
  UniqueFd socket_;
  int family_;
  bool tls_;
  std::string name_;
  std::string path_;
};

// Returns why OpenListener() would refuse the syntax of `address`; empty if it would not.
std::string FindAddressFault(std::string_view address);

// Whether connections to `address` will have TLS.
bool HasTls(std::string_view address);

// Opens `address`: "unix:/PATH" (every local user may connect; replaces the socket of a server that has ended),
// "127.0.0.1:PORT" or "[::1]:PORT" (port 0 takes a free one), "tls:ADDRESS:PORT" or "tls:[ADDRESS]:PORT" with TLS.
// Returns std::nullopt on failure; `error` then says why.
std::optional<Listener> OpenListener(std::string_view address, std::string* error);

// Adopts a listening socket that another program opened: a Unix socket or one of a loopback address, without TLS.
std::optional<Listener> AdoptListener(UniqueFd socket, std::string* error);

// Returns the sockets passed by systemd (sd_listen_fds(3)), not yet checked.
std::vector<UniqueFd> TakeActivatedSockets();

}  // namespace vorn::server

#endif  // VORN_SERVER_LISTENER_H
