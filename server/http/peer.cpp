#include "peer.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <iterator>

namespace vorn::server {
namespace {

// IPv4 connections to an IPv6 listener have mapped addresses (RFC 4291, 2.5.5.2).
Peer PeerAt(const in_addr& address) {
  Peer peer;
  char text[INET_ADDRSTRLEN] = "";
  peer.address = inet_ntop(AF_INET, &address, text, sizeof text) == nullptr ? "unknown" : text;
  peer.loopback = (ntohl(address.s_addr) >> 24) == IN_LOOPBACKNET;
  return peer;
}

Peer PeerAt(const in6_addr& address) {
  if (IN6_IS_ADDR_V4MAPPED(&address)) {
    in_addr mapped{};
    std::memcpy(&mapped, address.s6_addr + 12, sizeof mapped);
    return PeerAt(mapped);
  }
  Peer peer;
  char text[INET6_ADDRSTRLEN] = "";
  peer.address = inet_ntop(AF_INET6, &address, text, sizeof text) == nullptr ? "unknown" : text;
  peer.loopback = IN6_IS_ADDR_LOOPBACK(&address);
  return peer;
}

// Linux 4.13 has this option; socket(7) does not describe it. With too little room it fails with ERANGE and tells the
// size that is needed.
std::vector<gid_t> GroupsOf(int socket) {
  std::vector<gid_t> groups;
  socklen_t size = 0;
  if (getsockopt(socket, SOL_SOCKET, SO_PEERGROUPS, nullptr, &size) == 0 || errno != ERANGE) return groups;
  groups.resize(size / sizeof(gid_t));
  if (getsockopt(socket, SOL_SOCKET, SO_PEERGROUPS, groups.data(), &size) != 0) groups.clear();
  return groups;
}

}  // namespace

std::string Peer::ShareKey() const {
  if (address == "unix" || loopback) return "";
  in6_addr ipv6{};
  if (inet_pton(AF_INET6, address.c_str(), &ipv6) != 1) return address;
  std::fill(std::begin(ipv6.s6_addr) + 8, std::end(ipv6.s6_addr), std::uint8_t{0});
  char text[INET6_ADDRSTRLEN] = "";
  inet_ntop(AF_INET6, &ipv6, text, sizeof text);
  return std::string(text) + "/64";
}

Peer PeerOf(int socket) {
  Peer peer;
  sockaddr_storage storage{};
  socklen_t size = sizeof storage;
  if (getpeername(socket, reinterpret_cast<sockaddr*>(&storage), &size) != 0) {
    peer.address = "unknown";
  } else if (storage.ss_family == AF_INET) {
    peer = PeerAt(reinterpret_cast<const sockaddr_in&>(storage).sin_addr);
  } else if (storage.ss_family == AF_INET6) {
    peer = PeerAt(reinterpret_cast<const sockaddr_in6&>(storage).sin6_addr);
  } else {
    ucred credentials{};
    socklen_t length = sizeof credentials;
    if (getsockopt(socket, SOL_SOCKET, SO_PEERCRED, &credentials, &length) == 0) {
      peer.credentials = Peer::Credentials{credentials.pid, credentials.uid, credentials.gid, GroupsOf(socket)};
    }
  }
  return peer;
}

}  // namespace vorn::server
