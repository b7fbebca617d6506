// The other end of a connection.
#ifndef VORN_SERVER_PEER_H
#define VORN_SERVER_PEER_H

#include <sys/types.h>

#include <optional>
#include <string>
#include <vector>

namespace vorn::server {

// The other end of a connection.
struct Peer {
  // The credentials of the process that connected to a Unix socket, at the time of its connect(2) (SO_PEERCRED,
  // unix(7)).
  struct Credentials {
    pid_t pid;
    uid_t uid;
    gid_t gid;
    std::vector<gid_t> groups{};  // supplementary groups (SO_PEERGROUPS)
  };

  std::string address = "unix";  // "unix", or an IP address without its port: "192.0.2.7", "2001:db8::1"
  bool loopback = false;         // an address of this machine's loopback network
  std::optional<Credentials> credentials;

  // The key under which connections and bodies of this peer are counted together: the address, for IPv6 its /64
  // network. Empty for Unix sockets and loopback addresses, which all local users share.
  std::string ShareKey() const;
};

// Returns the peer of a connected socket. An address that cannot be determined is "unknown".
Peer PeerOf(int socket);

}  // namespace vorn::server

#endif  // VORN_SERVER_PEER_H
