// Where the server listens: Unix sockets, and loopback addresses for a trial.
#ifndef VORN_SERVER_LISTENER_H
#define VORN_SERVER_LISTENER_H

#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "unique_fd.h"

namespace vorn::server {

// A listening socket. One that was made at a path is removed from there with its object.
class Listener {
 public:
  // `path` is empty unless the file is this object's to remove.
  Listener(UniqueFd socket, int family, std::string name, std::string path);
  Listener(Listener&& other) noexcept;
  Listener& operator=(Listener&&) = delete;
  ~Listener();

  UniqueFd TakeSocket() { return std::move(socket_); }
  int family() const { return family_; }             // AF_UNIX, AF_INET or AF_INET6
  const std::string& name() const { return name_; }  // as --listen takes it

 private:
  UniqueFd socket_;
  int family_;
  std::string name_;
  std::string path_;
};

// Opens `address`: "unix:/PATH" (mode 0660; a socket that nobody serves any more is replaced), or
// "127.0.0.1:PORT" and "[::1]:PORT" where `allow_tcp` (port 0 takes a free one). Nobody can log in
// over TCP yet, so it is for trials alone. None on failure; `error` then says why.
std::optional<Listener> OpenListener(std::string_view address, bool allow_tcp, std::string* error);

// A listening socket that somebody else opened and that is now ours, under the same rules.
std::optional<Listener> AdoptListener(UniqueFd socket, bool allow_tcp, std::string* error);

// The sockets that systemd handed over (sd_listen_fds(3)), not yet checked.
std::vector<UniqueFd> TakeActivatedSockets();

}  // namespace vorn::server

#endif  // VORN_SERVER_LISTENER_H
