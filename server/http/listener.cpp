#include "listener.h"

#include <arpa/inet.h>
#include <fcntl.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <systemd/sd-daemon.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <utility>

namespace vorn::server {
namespace {

constexpr std::string_view kUnixScheme = "unix:";
constexpr std::string_view kTlsScheme = "tls:";
constexpr std::string_view kRule =
    "only unix:/PATH, 127.0.0.1:PORT and [::1]:PORT can be listened at without TLS, and tls:ADDRESS:PORT with TLS";

// Any socket address, with its size in bytes.
struct SocketAddress {
  sockaddr_storage storage{};
  socklen_t size = 0;

  const sockaddr* get() const { return reinterpret_cast<const sockaddr*>(&storage); }
  sockaddr* get() { return reinterpret_cast<sockaddr*>(&storage); }
  int family() const { return storage.ss_family; }

  template <typename Address>
  static SocketAddress Of(const Address& address) {
    SocketAddress any;
    std::memcpy(&any.storage, &address, sizeof address);
    any.size = sizeof address;
    return any;
  }
  template <typename Address>
  Address As() const {
    Address address;
    std::memcpy(&address, &storage, sizeof address);
    return address;
  }
};

std::string SystemError(const std::string& what) { return what + ": " + std::strerror(errno); }

std::optional<std::uint16_t> ParsePort(std::string_view text) {
  std::uint16_t port = 0;
  const auto [end, failure] = std::from_chars(text.data(), text.data() + text.size(), port);
  if (failure != std::errc() || end != text.data() + text.size()) return std::nullopt;
  return port;
}

// An address of TCP, and whether its connections have TLS.
struct Endpoint {
  SocketAddress address;
  bool tls = false;
};

std::optional<SocketAddress> ParseHost(std::string_view host, std::uint16_t port) {
  sockaddr_in ipv4{};
  ipv4.sin_family = AF_INET;
  ipv4.sin_port = htons(port);
  if (inet_pton(AF_INET, std::string(host).c_str(), &ipv4.sin_addr) == 1) return SocketAddress::Of(ipv4);
  if (host.size() < 2 || host.front() != '[' || host.back() != ']') return std::nullopt;
  sockaddr_in6 ipv6{};
  ipv6.sin6_family = AF_INET6;
  ipv6.sin6_port = htons(port);
  const std::string inner(host.substr(1, host.size() - 2));
  if (inet_pton(AF_INET6, inner.c_str(), &ipv6.sin6_addr) == 1) return SocketAddress::Of(ipv6);
  return std::nullopt;
}

bool IsLoopback(const SocketAddress& address) {
  if (address.family() == AF_INET) return address.As<sockaddr_in>().sin_addr.s_addr == htonl(INADDR_LOOPBACK);
  const auto ipv6 = address.As<sockaddr_in6>();
  return address.family() == AF_INET6 && IN6_IS_ADDR_LOOPBACK(&ipv6.sin6_addr);
}

std::optional<Endpoint> ParseTcp(std::string_view text) {
  const bool tls = HasTls(text);
  if (tls) text.remove_prefix(kTlsScheme.size());
  const std::size_t colon = text.rfind(':');
  if (colon == std::string_view::npos) return std::nullopt;
  const auto port = ParsePort(text.substr(colon + 1));
  const auto address = port ? ParseHost(text.substr(0, colon), *port) : std::nullopt;
  if (!address || (!tls && !IsLoopback(*address))) return std::nullopt;
  return Endpoint{*address, tls};
}

bool IsUnix(std::string_view address) { return address.substr(0, kUnixScheme.size()) == kUnixScheme; }

std::optional<SocketAddress> UnixAddress(const std::string& path, std::string* error) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  if (path.empty() || path.front() != '/' || path.size() >= sizeof address.sun_path) {
    *error = "the path of a socket is absolute and at most " + std::to_string(sizeof address.sun_path - 1) + " bytes";
    return std::nullopt;
  }
  path.copy(address.sun_path, path.size());
  return SocketAddress::Of(address);
}

// Returns the socket, bound and listening; an empty one with errno set on failure.
UniqueFd BindAndListen(const SocketAddress& address) {
  UniqueFd socket(::socket(address.family(), SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
  const int on = 1;
  if (socket && address.family() != AF_UNIX) {
    // Connections inherit both.
    setsockopt(socket.get(), IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
    setsockopt(socket.get(), SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
    // Otherwise [::] would take the IPv4 addresses, too, and 0.0.0.0 could not be listened at beside it.
    if (address.family() == AF_INET6) setsockopt(socket.get(), IPPROTO_IPV6, IPV6_V6ONLY, &on, sizeof on);
  }
  if (!socket || bind(socket.get(), address.get(), address.size) != 0 || listen(socket.get(), SOMAXCONN) != 0)
    return {};
  return socket;
}

// Returns whether a server accepts connections at this path.
bool IsServed(const SocketAddress& address) {
  const UniqueFd probe(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
  return probe && (connect(probe.get(), address.get(), address.size) == 0 || errno == EAGAIN);
}

// Removes the socket file of a server that has ended. Returns false if the file must not be removed.
bool ClearPath(const std::string& path, const SocketAddress& address, std::string* error) {
  struct stat there {};
  if (lstat(path.c_str(), &there) != 0) return true;  // binding says more
  if (!S_ISSOCK(there.st_mode)) *error = path + " is there and is no socket";
  if (S_ISSOCK(there.st_mode) && IsServed(address)) *error = path + " is served by another program";
  if (error->empty() && unlink(path.c_str()) != 0) *error = SystemError(path);
  return error->empty();
}

std::optional<Listener> OpenUnix(const std::string& path, std::string* error) {
  const std::optional<SocketAddress> address = UnixAddress(path, error);
  if (!address || !ClearPath(path, *address, error)) return std::nullopt;
  // Every local user may connect: the credentials of the peer, or a token, decide what it may do. The umask gives the
  // socket its mode when it is created.
  const mode_t before = umask(0111);
  UniqueFd socket = BindAndListen(*address);
  umask(before);
  if (socket) return Listener(std::move(socket), AF_UNIX, false, std::string(kUnixScheme) + path, path);
  *error = SystemError(path);
  return std::nullopt;
}

SocketAddress LocalAddress(int socket) {
  SocketAddress address;
  address.size = sizeof address.storage;
  if (getsockname(socket, address.get(), &address.size) != 0) address.storage.ss_family = AF_UNSPEC;
  return address;
}

// Returns the address in the syntax of --listen; empty for a socket of another address family.
std::string NameOf(const SocketAddress& address) {
  if (address.family() == AF_UNIX) return std::string(kUnixScheme) + address.As<sockaddr_un>().sun_path;
  char text[INET6_ADDRSTRLEN] = "";
  if (address.family() == AF_INET) {
    const auto ipv4 = address.As<sockaddr_in>();
    inet_ntop(AF_INET, &ipv4.sin_addr, text, sizeof text);
    return std::string(text) + ":" + std::to_string(ntohs(ipv4.sin_port));
  }
  if (address.family() != AF_INET6) return "";
  const auto ipv6 = address.As<sockaddr_in6>();
  inet_ntop(AF_INET6, &ipv6.sin6_addr, text, sizeof text);
  return "[" + std::string(text) + "]:" + std::to_string(ntohs(ipv6.sin6_port));
}

}  // namespace

Listener::Listener(UniqueFd socket, int family, bool tls, std::string name, std::string path)
    : socket_(std::move(socket)), family_(family), tls_(tls), name_(std::move(name)), path_(std::move(path)) {}

Listener::Listener(Listener&& other) noexcept
    : socket_(std::move(other.socket_)),
      family_(other.family_),
      tls_(other.tls_),
      name_(std::move(other.name_)),
      path_(std::exchange(other.path_, {})) {}

Listener::~Listener() {
  if (!path_.empty()) unlink(path_.c_str());
}

std::string FindAddressFault(std::string_view address) {
  std::string error;
  if (IsUnix(address)) {
    (void)UnixAddress(std::string(address.substr(kUnixScheme.size())), &error);
  } else if (!ParseTcp(address)) {
    error = kRule;
  }
  return error;
}

bool HasTls(std::string_view address) { return address.substr(0, kTlsScheme.size()) == kTlsScheme; }

std::optional<Listener> OpenListener(std::string_view address, std::string* error) {
  *error = FindAddressFault(address);
  if (!error->empty()) return std::nullopt;
  if (IsUnix(address)) return OpenUnix(std::string(address.substr(kUnixScheme.size())), error);
  const Endpoint endpoint = *ParseTcp(address);
  UniqueFd socket = BindAndListen(endpoint.address);
  if (!socket) {
    *error = SystemError(std::string(address));
    return std::nullopt;
  }
  std::string name = (endpoint.tls ? std::string(kTlsScheme) : "") + NameOf(LocalAddress(socket.get()));
  return Listener(std::move(socket), endpoint.address.family(), endpoint.tls, std::move(name), "");
}

std::optional<Listener> AdoptListener(UniqueFd socket, std::string* error) {
  const SocketAddress address = LocalAddress(socket.get());
  if (sd_is_socket(socket.get(), AF_UNSPEC, SOCK_STREAM, 1) <= 0) {
    *error = "not a listening stream socket";
  } else if (address.family() != AF_UNIX && !IsLoopback(address)) {
    *error = kRule;
  } else {
    fcntl(socket.get(), F_SETFL, fcntl(socket.get(), F_GETFL) | O_NONBLOCK);
    return Listener(std::move(socket), address.family(), false, NameOf(address), "");
  }
  return std::nullopt;
}

std::vector<UniqueFd> TakeActivatedSockets() {
  std::vector<UniqueFd> sockets;
  const int count = sd_listen_fds(1);
  sockets.reserve(static_cast<std::size_t>(count > 0 ? count : 0));
  for (int i = 0; i < count; ++i) sockets.emplace_back(SD_LISTEN_FDS_START + i);
  return sockets;
}

}  // namespace vorn::server
